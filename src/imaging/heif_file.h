// SPDX-License-Identifier: MIT
// What a HEIF says of its pictures (ISO/IEC 23008-12), and their coded bytes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "imaging/codec.h"
#include "imaging/decode_request.h"
#include "platform/images/heif_items.h"

namespace brivo::imaging {

/// Longest ICC profile that is kept, in bytes; cameras write a few hundred.
inline constexpr std::size_t kMostProfileBytes = 4'194'304;

/// What sample values mean, as code points of ISO/IEC 23091-2.
struct ColourCodes {
  std::uint16_t primaries = 2;  ///< 2, here and in the next: not said
  std::uint16_t transfer = 2;
  std::uint16_t matrix = 2;
  bool isFullRange = true;
};

/// An item that is a picture.
struct HeifPicture {
  std::uint32_t id = 0;
  images::FourCharacters type = 0;
  Extent size;                         ///< 0 × 0 when the file does not say it
  images::Box configuration;           ///< hvcC or av1C, which the codec understands
  images::Box iccProfile;              ///< the profile itself
  std::optional<ColourCodes> colours;  ///< count more than what the coded bytes say
};

/// One reading of one file. *Thread-bound.*
class HeifFile {
 public:
  /// `source` must outlive this.
  explicit HeifFile(const images::ByteSource& source);

  /// The picture that the file is there for; none when the bytes are no HEIF, or have only a sequence.
  std::optional<HeifPicture> primary();
  /// Smaller ones of picture `master`.
  std::vector<HeifPicture> thumbnailsOf(std::uint32_t master);
  /// Those that picture `whole` is put together from, in their order, by their identifiers.
  std::vector<std::uint32_t> partsOf(std::uint32_t whole) const;
  HeifPicture picture(std::uint32_t id);

  /// The bytes that an item consists of; null unless all of them lie in one place of the file, and it gives
  /// them.
  Packet bytesOf(std::uint32_t item) const;
  /// The content of `box`; empty when it is longer than `most` bytes or the file does not give it.
  std::vector<std::byte> contentOf(const images::Box& box, std::size_t most) const;

 private:
  const images::ByteSource& source_;
  images::Parse parse_;
  const images::HeifItems items_;
  std::map<std::uint32_t, images::FourCharacters> types_;
};

}  // namespace brivo::imaging
