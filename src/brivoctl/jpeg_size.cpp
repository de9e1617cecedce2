// SPDX-License-Identifier: MIT
#include <bit>

#include "brivoctl/jpeg_image.h"
#include "platform/base/byte_cursor.h"

namespace brivoctl {

namespace {

// Marker codes of ITU-T T.81, table B.1.
constexpr std::uint16_t kStartOfImage = 0xFFD8;
constexpr std::uint8_t kFill = 0xFF;
constexpr std::uint8_t kHuffmanTables = 0xC4;
constexpr std::uint8_t kReserved = 0xC8;
constexpr std::uint8_t kArithmeticConditions = 0xCC;
constexpr std::uint8_t kEndOfImage = 0xD9;
constexpr std::uint8_t kStartOfScan = 0xDA;

bool isFrameHeader(std::uint8_t marker) {
  return marker >= 0xC0 && marker <= 0xCF && marker != kHuffmanTables && marker != kReserved &&
         marker != kArithmeticConditions;
}

/// The code of the next marker; 0 when something else comes.
std::uint8_t nextMarker(brivo::ByteCursor& cursor) {
  if (cursor.u8() != kFill) return 0;
  std::uint8_t code = cursor.u8();
  while (cursor.ok() && code == kFill) code = cursor.u8();
  return code;
}

PictureSize frameSize(brivo::ByteCursor& cursor) {
  cursor.skip(3);  // length and bits of a sample
  const std::uint32_t height = cursor.u16();
  const std::uint32_t width = cursor.u16();
  return {width, height};
}

}  // namespace

std::optional<PictureSize> jpegSize(std::span<const std::byte> jpeg) {
  brivo::ByteCursor cursor(jpeg, std::endian::big);
  if (cursor.u16() != kStartOfImage) return std::nullopt;
  for (;;) {
    const std::uint8_t marker = nextMarker(cursor);
    if (isFrameHeader(marker)) {
      const PictureSize size = frameSize(cursor);
      return cursor.ok() ? std::optional(size) : std::nullopt;
    }
    if (marker == 0 || marker == kStartOfScan || marker == kEndOfImage) return std::nullopt;
    const std::uint16_t length = cursor.u16();
    if (!cursor.ok() || length < 2) return std::nullopt;
    cursor.skip(length - 2U);
  }
}

}  // namespace brivoctl
