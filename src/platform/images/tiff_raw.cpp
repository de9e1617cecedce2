// SPDX-License-Identifier: MIT
#include "platform/images/tiff_raw.h"

#include <algorithm>
#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/exif.h"

namespace brivo::images {

namespace {

constexpr std::uint16_t kTiffMagic = 42;
constexpr std::uint16_t kBigTiffMagic = 43;
constexpr std::uint16_t kPanasonicMagic = 0x0055;

// Values of tag 0x0106.
constexpr std::uint64_t kColorFilterArray = 32803;
constexpr std::uint64_t kLinearRaw = 34892;

// Tags of Panasonic's first directory.
constexpr std::uint16_t kTopBorder = 0x0004;
constexpr std::uint16_t kLeftBorder = 0x0005;
constexpr std::uint16_t kBottomBorder = 0x0006;
constexpr std::uint16_t kRightBorder = 0x0007;
constexpr std::uint16_t kPanasonicBits = 0x000A;
constexpr std::uint16_t kJpegFromRaw = 0x002E;

/// The directory of Sony's own tags, and in it Minolta's blocks, which Sony's first cameras still wrote.
constexpr std::uint16_t kModel = 0x0110;
constexpr std::string_view kFirstOfSony = "DSLR-";
constexpr std::uint16_t kSonyDirectory = 0xC634;
constexpr std::uint16_t kMinoltaBlocks = 0x7250;

constexpr std::uint16_t kDefaultCropSize = 0xC620;

/// An element of an entry as a whole number, a rational rounded down.
std::uint64_t wholeNumber(const TiffBlock& block, TiffEntry entry, std::uint64_t index) {
  if (entry.type != TiffType::rational) return block.number(entry, index).value_or(0);
  entry.type = TiffType::longInteger;
  entry.count *= 2;
  const std::uint64_t denominator = block.number(entry, 2 * index + 1).value_or(0);
  return denominator == 0 ? 0 : block.number(entry, 2 * index).value_or(0) / denominator;
}

/// Canon marks its raw files behind the header, and states of none of their images that it is raw data.
bool hasCanonMark(const TiffBlock& block) {
  ByteCursor cursor(block.parse().ranges.bytes(block.start() + 8, 2), std::endian::big);
  return cursor.u16() == 0x4352;  // "CR"
}

PixelSize betweenBorders(const TiffBlock& block, const TiffDirectory& first) {
  const auto border = [&](std::uint16_t tag) { return block.number(first, tag).value_or(0); };
  const std::uint64_t left = border(kLeftBorder), right = border(kRightBorder);
  const std::uint64_t top = border(kTopBorder), bottom = border(kBottomBorder);
  return left < right && top < bottom ? pixelSize(right - left, bottom - top) : PixelSize();
}

/// Minolta's first block holds its sizes: of the sensor, then of the image.
PixelSize minoltaSize(TiffBlock& block, const TiffDirectory& first) {
  constexpr std::size_t kBeforeSizes = 28, kAllBytes = 32;
  const TiffEntry* model = first.find(kModel);
  const TiffEntry* place = first.find(kSonyDirectory);
  if (!model || !place || !block.text(*model).starts_with(kFirstOfSony)) return {};
  TiffEntry offset = *place;  // four bytes that are one number
  offset.type = TiffType::longInteger;
  const TiffDirectory sony = block.directory(block.number(offset).value_or(block.length()));
  const TiffEntry* blocks = sony.find(kMinoltaBlocks);
  if (!blocks) return {};
  ByteCursor cursor(block.bytes(*blocks, kAllBytes), block.order());
  cursor.skip(kBeforeSizes);
  const std::uint16_t height = cursor.u16();
  return {cursor.u16(), height};
}

}  // namespace

bool isSensorData(const TiffBlock& block, const TiffDirectory& directory) {
  const std::uint64_t stated = block.number(directory, tag::kPhotometricInterpretation).value_or(0);
  return stated == kColorFilterArray || stated == kLinearRaw;
}

bool isRawFile(const TiffBlock& block, std::span<const TiffDirectory> directories) {
  const bool isPlain = block.magic() == kTiffMagic || block.magic() == kBigTiffMagic;
  return !isPlain || hasCanonMark(block) ||
         std::ranges::any_of(directories, [&](const auto& each) { return isSensorData(block, each); });
}

PixelSize imageOnSensor(TiffBlock& block, const TiffDirectory& first) {
  return block.magic() == kPanasonicMagic ? betweenBorders(block, first) : minoltaSize(block, first);
}

std::uint16_t sampleBits(const TiffBlock& block, const TiffDirectory& directory) {
  const bool isPanasonic = block.magic() == kPanasonicMagic;
  const auto bits = block.number(directory, isPanasonic ? kPanasonicBits : tag::kBitsPerSample);
  return static_cast<std::uint16_t>(bits.value_or(0));
}

PixelSize defaultCrop(const TiffBlock& block, const TiffDirectory& directory) {
  const TiffEntry* entry = directory.find(kDefaultCropSize);
  return entry ? pixelSize(wholeNumber(block, *entry, 0), wholeNumber(block, *entry, 1)) : PixelSize();
}

const TiffEntry* panasonicJpeg(const TiffBlock& block, const TiffDirectory& first) {
  return block.magic() == kPanasonicMagic ? first.find(kJpegFromRaw) : nullptr;
}

}  // namespace brivo::images
