// SPDX-License-Identifier: MIT
#include "platform/images/tiff.h"

#include <algorithm>
#include <span>
#include <vector>

#include "platform/images/exif.h"
#include "platform/images/jpeg.h"
#include "platform/images/maker_previews.h"
#include "platform/images/tiff_raw.h"

namespace brivo::images {

namespace {

constexpr std::uint16_t kDngPrivateData = 0xC634;

/// All directories that the first one leads to: itself, its next one if it names one, its subdirectories,
/// theirs, and so on. Those that cannot be read, or were before, are empty.
std::vector<TiffDirectory> readDirectories(TiffBlock& block) {
  std::vector<TiffDirectory> all{block.directory(block.firstDirectory())};
  const auto add = [&](std::uint64_t offset) {
    if (offset != 0) all.push_back(block.directory(offset));
  };
  for (std::size_t i = 0; i < all.size(); ++i) {
    add(all[i].next);
    const TiffEntry* found = all[i].find(tag::kSubDirectories);
    const TiffEntry inner = found ? *found : TiffEntry();
    const std::size_t count = block.parse().spendEntries(inner.count);
    for (std::size_t k = 0; k < count; ++k) add(block.number(inner, k).value_or(0));
  }
  return all;
}

/// An image by itself or a page, not a reduced version or a mask of another.
bool isFullImage(const TiffBlock& block, const TiffDirectory& directory) {
  const std::uint64_t kind = block.number(directory, tag::kNewSubfileType).value_or(0);
  return (kind == 0 || kind == 2) && statedSize(block, directory);
}

/// Pixels of a full image that is not a JPEG beside it; 0 for anything else.
std::uint64_t pixelsOf(const TiffBlock& block, const TiffDirectory& directory) {
  if (!isFullImage(block, directory) || directory.find(tag::kJpegOffset)) return 0;
  const PixelSize size = statedSize(block, directory);
  return std::uint64_t{size.width} * size.height;
}

const TiffDirectory& mainOf(const TiffBlock& block, std::span<const TiffDirectory> all) {
  if (isFullImage(block, all.front())) return all.front();
  return *std::ranges::max_element(all, {}, [&](const auto& each) { return pixelsOf(block, each); });
}

/// A picture of 8 bits in one strip with compression 6 or 7 may be a JPEG with all its tables. Canon states
/// the same compression for its raw data, but no size, or 16 bits.
bool hasJpegStrip(const TiffBlock& block, const TiffDirectory& directory) {
  const std::uint64_t compression = block.number(directory, tag::kCompression).value_or(0);
  const TiffEntry* strips = directory.find(tag::kStripOffsets);
  return (compression == 6 || compression == 7) && strips && strips->count == 1 &&
         statedSize(block, directory) && block.number(directory, tag::kBitsPerSample) == 8U &&
         !isSensorData(block, directory);
}

void addJpegs(const TiffBlock& block, const TiffDirectory& directory) {
  addNamedJpeg(block, directory, tag::kJpegOffset, tag::kJpegLength);
  if (hasJpegStrip(block, directory))
    addNamedJpeg(block, directory, tag::kStripOffsets, tag::kStripByteCounts);
}

void readSizes(TiffBlock& block, std::span<const TiffDirectory> directories, bool isRaw) {
  ImageProperties& found = block.parse().found;
  const TiffDirectory& main = mainOf(block, directories);
  found.size = imageOnSensor(block, directories.front());
  setOnce(found.size, statedSize(block, main));
  found.depth = sampleBits(block, main);
  if (!isRaw) return;
  found.crop = defaultCrop(block, main);
  setOnce(found.crop, found.size);
}

/// All finished JPEGs that directories and maker notes name. No directory of `unread` has been read yet.
void addPreviews(TiffBlock unread, std::span<const TiffDirectory> directories) {
  const TiffDirectory& first = directories.front();
  readMakerPreviews(unread, first);
  const TiffEntry* moved = first.find(kDngPrivateData);
  const TiffEntry* make = first.find(tag::kMake);
  if (moved && make)
    readMovedMakerPreviews(unread.parse(), moved->position, moved->length, unread.text(*make));
  if (const TiffEntry* whole = panasonicJpeg(unread, first))
    addEmbeddedJpeg(unread.parse(), whole->position, whole->length);
  for (const TiffDirectory& directory : directories) addJpegs(unread, directory);
}

EmbeddedImage smallestOf(std::span<const EmbeddedImage> images) {
  const auto smallest = std::ranges::min_element(images, {}, &EmbeddedImage::length);
  return smallest == images.end() ? EmbeddedImage() : *smallest;
}

/// The thumbnail in the directory behind the first one, or in Panasonic's JPEG; no other is called one.
void readThumbnails(TiffBlock& block, std::span<const TiffDirectory> directories) {
  if (directories.front().next != 0) readThumbnail(block, directories[1]);
  if (const TiffEntry* whole = panasonicJpeg(block, directories.front()))
    readJpeg(block.parse(), whole->position, whole->length);
}

}  // namespace

bool readTiffFile(Parse& parse) {
  auto block = TiffBlock::at(parse, 0, parse.ranges.size());
  if (!block) return false;
  parse.ranges.allow(kForDirectories);
  const TiffBlock unread = *block;
  const auto directories = readDirectories(*block);
  const bool isRaw = isRawFile(*block, directories);
  readSizes(*block, directories, isRaw);
  readMainDirectory(*block, directories.front());
  readThumbnails(*block, directories);
  const bool needsThumbnail = isRaw && !parse.found.thumbnail;
  if (needsThumbnail || parse.scope == Scope::previews) addPreviews(unread, directories);
  if (needsThumbnail) parse.found.thumbnail = smallestOf(parse.found.embedded);
  if (parse.scope != Scope::previews) parse.found.embedded.clear();
  return true;
}

}  // namespace brivo::images
