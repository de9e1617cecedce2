// SPDX-License-Identifier: MIT
// Made-up image files for tests: TIFF directories and JPEGs, byte by byte.
#pragma once

#include <bit>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace brivo::test {

/// `value` in `width` bytes.
std::string integer(std::uint64_t value, std::size_t width, std::endian order = std::endian::little);

/// Writes a TIFF block: directories with fields, then their longer values. Offsets count from its start.
class TiffBytes {
 public:
  explicit TiffBytes(std::endian order = std::endian::little, bool big = false) : order_(order), big_(big) {}

  /// Begins a directory; the fields that follow are in it. Gives its number, from 0 on.
  std::size_t beginDirectory();
  /// Directory `from` says that `to` is the next one.
  void link(std::size_t from, std::size_t to) { directories_[from].next = to + 1; }

  // Fields of the directory begun last.
  void raw(std::uint16_t tag, std::uint16_t type, std::uint64_t count, std::string value);
  void ascii(std::uint16_t tag, std::string_view text);  ///< with its NUL
  void bytes(std::uint16_t tag, std::initializer_list<unsigned> values);
  void undefined(std::uint16_t tag, std::string_view value);
  void shorts(std::uint16_t tag, std::initializer_list<unsigned> values);
  void longs(std::uint16_t tag, std::initializer_list<std::uint64_t> values);
  void rationals(std::uint16_t tag, std::initializer_list<std::pair<std::uint32_t, std::uint32_t>> values);
  /// Names the directory with number `to`, which may be begun later.
  void directory(std::uint16_t tag, std::size_t to) { directories(tag, {to}); }
  /// Names several.
  void directories(std::uint16_t tag, std::initializer_list<std::size_t> to);
  /// The offset of `content`, which lies behind the directories, as a LONG.
  void offsetOf(std::uint16_t tag, std::string content);
  /// The same, with its length under `lengthTag`.
  void placed(std::uint16_t offsetTag, std::uint16_t lengthTag, std::string content);

  /// All of it; `magic` stands in the place of 42, and `gap` bytes between the header and the first
  /// directory.
  std::string build(std::uint16_t magic = 42, std::size_t gap = 0) const;

 private:
  struct Field {
    std::uint16_t tag;
    std::uint16_t type;
    std::uint64_t count;
    std::string value;
    std::vector<std::size_t> targets{};  ///< directories whose offsets are the value
    bool placed = false;                 ///< the value is content whose offset is the field's value
  };
  struct Directory {
    std::vector<Field> fields;
    std::size_t next = 0;  ///< number of a directory, from 1 on
  };

  std::string number(std::uint64_t value, std::size_t width) const { return integer(value, width, order_); }
  std::size_t sizeOf(const Directory& directory) const;

  const std::endian order_;
  const bool big_;
  std::vector<Directory> directories_;
};

/// A JPEG marker segment with its length.
std::string jpegSegment(unsigned marker, std::string_view parameters);
/// SOF0 of a picture with `components` 8-bit components.
std::string jpegFrame(unsigned width, unsigned height, unsigned components = 3);
/// APP1 with EXIF.
std::string exifSegment(std::string_view tiff);
/// A JPEG with `segments` before its frame header, and no picture.
std::string jpeg(unsigned width, unsigned height, std::string_view segments = {});

}  // namespace brivo::test
