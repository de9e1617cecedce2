// SPDX-License-Identifier: MIT
#pragma once

#include <bit>
#include <cstdint>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

#include "platform/images/parse.h"

namespace brivo::images {

/// Types of TIFF 6.0 section 2, with those of BigTIFF and EXIF 3.0.
enum class TiffType : std::uint16_t {
  byte = 1,
  ascii = 2,
  shortInteger = 3,
  longInteger = 4,
  rational = 5,
  signedByte = 6,
  undefined = 7,
  signedShort = 8,
  signedLong = 9,
  signedRational = 10,
  real32 = 11,
  real64 = 12,
  directory = 13,
  long64 = 16,
  signedLong64 = 17,
  directory64 = 18,
  utf8 = 129,
};

/// Bytes of one element; 0 for a type that does not exist.
std::size_t sizeOfTiffType(TiffType type);

/// One entry of a directory.
struct TiffEntry {
  std::uint16_t tag = 0;
  TiffType type{};
  std::uint64_t count = 0;     ///< elements
  std::uint64_t position = 0;  ///< of the value, in bytes from the start of the block
  std::uint64_t length = 0;    ///< of the value, in bytes
};

/// The entries of a directory, and where the next one is (0: there is none).
struct TiffDirectory {
  std::vector<TiffEntry> entries;
  std::uint64_t next = 0;

  /// The first entry with `tag`, or null.
  const TiffEntry* find(std::uint16_t tag) const;
};

/// Directories of TIFF (Adobe TIFF 6.0) or BigTIFF somewhere in a file: all offsets count from the start of
/// the block. Bad entries are left out, and a directory is read once. *Thread-bound.*
class TiffBlock {
 public:
  /// The block with a TIFF header at `start`, of at most `length` bytes; none when there is none. The headers
  /// of the raw families that deviate in their magic number alone count as well.
  static std::optional<TiffBlock> at(Parse& parse, std::uint64_t start, std::uint64_t length);
  /// Directories without a header, as maker notes have them.
  TiffBlock(Parse& parse, std::uint64_t start, std::uint64_t length, std::endian order, bool big = false);

  /// Offset of the directory that the header names.
  std::uint64_t firstDirectory() const { return firstDirectory_; }
  /// What the header has in the place of 42.
  std::uint16_t magic() const { return magic_; }
  std::endian order() const { return order_; }
  /// Where the block starts in the file.
  std::uint64_t start() const { return start_; }
  std::uint64_t length() const { return length_; }
  Parse& parse() const { return *parse_; }

  /// The directory at `offset`; empty when none can be read there, when it was read before, and when the
  /// parse may not read another.
  TiffDirectory directory(std::uint64_t offset);

  /// The bytes of a value, borrowed from the parse; empty when they cannot be had.
  std::span<const std::byte> bytes(const TiffEntry& entry) const;
  /// The same, only the first `most` of them.
  std::span<const std::byte> bytes(const TiffEntry& entry, std::size_t most) const;
  /// One element of any integer type, a negative one wrapped; none when there is no such element.
  std::optional<std::uint64_t> number(const TiffEntry& entry, std::uint64_t index = 0) const;
  /// The same for the entry with `tag` of `directory`.
  std::optional<std::uint64_t> number(const TiffDirectory& directory, std::uint16_t tag) const;
  /// A text value up to its first NUL, borrowed from the parse.
  std::string_view text(const TiffEntry& entry) const;

 private:
  Parse* parse_;
  std::uint64_t start_;
  std::uint64_t length_;
  std::endian order_;
  bool big_;
  std::uint16_t magic_ = 0;
  std::uint64_t firstDirectory_ = 0;
  std::vector<std::uint64_t> seen_;
};

}  // namespace brivo::images
