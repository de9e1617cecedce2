// SPDX-License-Identifier: MIT
#include "platform/images/bmp.h"

#include <algorithm>
#include <bit>

#include "platform/base/byte_cursor.h"

namespace brivo::images {

namespace {

constexpr std::size_t kFileHeader = 14;
constexpr std::uint32_t kShortHeader = 12;  // OS/2 1.x
constexpr std::uint32_t kShortestLongHeader = 16;
constexpr std::uint32_t kLongestHeader = 124;
constexpr std::size_t kMostBytes = 30;
constexpr std::uint16_t kMostDepth = 8;

struct Header {
  PixelSize size;
  std::uint16_t bitsPerPixel = 0;
  explicit operator bool() const { return size && bitsPerPixel != 0; }
};

/// A height below zero says that the lines begin at the top.
std::uint32_t magnitude(std::uint32_t number) {
  return std::bit_cast<std::int32_t>(number) < 0 ? 0U - number : number;
}

Header readHeader(ByteCursor& cursor, bool isShort) {
  Header header;
  header.size.width = isShort ? cursor.u16() : cursor.u32();
  header.size.height = isShort ? cursor.u16() : magnitude(cursor.u32());
  const bool hasOnePlane = cursor.u16() == 1;
  header.bitsPerPixel = cursor.u16();
  const bool isBad = std::bit_cast<std::int32_t>(header.size.width) < 0 || !hasOnePlane || !cursor.ok();
  return isBad ? Header() : header;
}

}  // namespace

bool readBmp(Parse& parse) {
  ByteCursor cursor(parse.ranges.upTo(0, kMostBytes));
  const bool hasSignature = cursor.u8() == 'B' && cursor.u8() == 'M';
  cursor.skip(kFileHeader - 2);
  const std::uint32_t length = cursor.u32();
  const bool isShort = length == kShortHeader;
  // Two letters are a weak signature, and so the length has to be one that exists.
  if (!hasSignature || (!isShort && (length < kShortestLongHeader || length > kLongestHeader))) return false;
  if (const Header header = readHeader(cursor, isShort)) {
    parse.found.size = header.size;
    parse.found.depth = std::min(header.bitsPerPixel, kMostDepth);
  }
  return true;
}

}  // namespace brivo::images
