// SPDX-License-Identifier: MIT
// Boxes of the ISO base media file format (ISO/IEC 14496-12 section 4.2), and the tracks in them.
#pragma once

#include <array>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/base/byte_cursor.h"
#include "platform/images/parse.h"

namespace brivo::images {

/// Four characters that name a box, a brand or a kind of item.
using FourCharacters = std::uint32_t;

constexpr FourCharacters fourCharacters(std::string_view text) {
  FourCharacters value = 0;
  for (const char character : text) value = value << 8 | static_cast<unsigned char>(character);
  return value;
}

/// One box. The default one is empty: there is nothing to read in it.
struct Box {
  FourCharacters type = 0;
  std::array<std::uint64_t, 2> uuid{};  ///< the extended type, in a box of the type "uuid"
  std::uint64_t start = 0;              ///< of its content, in bytes from the start of the file
  std::uint64_t length = 0;             ///< of its content, in bytes, as far as it lies in what holds the box
};

/// The boxes in a row that a box holds, or a file. Each takes an entry from what the parse may look at.
/// *Thread-bound.*
class Boxes {
 public:
  /// Those of a file.
  explicit Boxes(Parse& parse) : parse_(parse), next_(0), end_(parse.ranges.size()) {}
  /// Those that stand in `holder` behind the first `before` bytes of its content.
  Boxes(Parse& parse, const Box& holder, std::uint64_t before = 0);

  /// The next box; none behind the last one, or where they are broken.
  std::optional<Box> next();

 private:
  Parse& parse_;
  std::uint64_t next_;
  const std::uint64_t end_;
};

/// The first box with `type` that `holder` holds behind `before` bytes, or an empty one.
Box childOf(Parse& parse, const Box& holder, FourCharacters type, std::uint64_t before = 0);

/// Longest content that is read as one table, in bytes.
inline constexpr std::size_t kLongestTable = 131'072;
/// Walks the content of a box, at most `most` bytes of it; it is big-endian, as everything in boxes.
ByteCursor contentOf(Parse& parse, const Box& box, std::size_t most = kLongestTable);

/// Bytes of version and flags.
inline constexpr std::uint64_t kFullBoxBytes = 4;
/// What the content of a full box begins with.
struct FullBoxHeader {
  std::uint8_t version;
  std::uint32_t flags;
};
FullBoxHeader fullBoxHeader(ByteCursor& cursor);

/// What a file says it is: its major brand, then the compatible ones; none when it does not begin as a file
/// of this format.
std::vector<FourCharacters> brandsOf(Parse& parse);

/// What a track of pictures says.
struct PictureTrack {
  PixelSize size;                  ///< of its first sample entry; 0 × 0 when there is none
  std::uint64_t sampleOffset = 0;  ///< of its first sample, in bytes from the start of the file
  std::uint64_t sampleLength = 0;  ///< of its first sample, in bytes; 0 when there is none
};

/// The first track of a movie box.
PictureTrack firstTrack(Parse& parse, const Box& movie);

}  // namespace brivo::images
