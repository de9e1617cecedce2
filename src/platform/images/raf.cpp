// SPDX-License-Identifier: MIT
#include "platform/images/raf.h"

#include <algorithm>
#include <array>
#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/raw_preview.h"

namespace brivo::images {

namespace {

constexpr std::string_view kSignature = "FUJIFILMCCD-RAW ";
constexpr std::size_t kPointers = 84;
constexpr std::size_t kPointerBytes = 16;
/// The sizes stand first in the list, before long tables.
constexpr std::uint64_t kMostListBytes = 4096;

constexpr std::uint16_t kFullSize = 0x0100;
constexpr std::uint16_t kCroppedSize = 0x0111;
constexpr std::uint16_t kOutputSize = 0x0121;
/// What is displayed comes closest to the first of these that a file has.
constexpr std::array<std::uint16_t, 3> kSizesByRank{kCroppedSize, kOutputSize, kFullSize};

/// The photosites of diagonal sensors stand in half as many lines as the picture has.
PixelSize unfolded(PixelSize size) {
  const bool isFolded = size.height < size.width / 2;
  return isFolded ? PixelSize{size.width, size.height * 2} : size;
}

PixelSize sizeIn(ByteCursor value) {
  PixelSize size;
  size.height = value.u16();
  size.width = value.u16();
  return value.ok() ? size : PixelSize();
}

/// The list: a count, then entries of a tag, the length of the value, and the value.
PixelSize rawSizeOf(Parse& parse, std::uint64_t offset, std::uint64_t length) {
  std::array<PixelSize, kSizesByRank.size()> sizes{};
  ByteCursor cursor(parse.ranges.upTo(offset, static_cast<std::size_t>(std::min(length, kMostListBytes))),
                    std::endian::big);
  const std::size_t count = parse.spendEntries(cursor.u32());
  for (std::size_t i = 0; i < count && cursor.ok(); ++i) {
    const auto rank = std::ranges::find(kSizesByRank, cursor.u16());
    const ByteCursor value(cursor.take(cursor.u16()), std::endian::big);
    if (rank != kSizesByRank.end())
      sizes[static_cast<std::size_t>(rank - kSizesByRank.begin())] = sizeIn(value);
  }
  const auto best = std::ranges::find_if(sizes, [](PixelSize size) { return static_cast<bool>(size); });
  return best == sizes.end() ? PixelSize() : unfolded(*best);
}

}  // namespace

bool readRaf(Parse& parse) {
  const auto header = parse.ranges.upTo(0, kPointers + kPointerBytes);
  if (!lettersOf(header).starts_with(kSignature)) return false;
  parse.ranges.allow(kForDirectories);
  ByteCursor cursor(header, std::endian::big);
  cursor.seek(kPointers);
  const std::uint32_t jpegOffset = cursor.u32();
  const std::uint32_t jpegLength = cursor.u32();
  const std::uint32_t listOffset = cursor.u32();
  const std::uint32_t listLength = cursor.u32();
  if (!cursor.ok()) return true;
  parse.found.size = parse.found.crop = rawSizeOf(parse, listOffset, listLength);
  readRawPreview(parse, jpegOffset, jpegLength);
  return true;
}

}  // namespace brivo::images
