// SPDX-License-Identifier: MIT
#include "platform/images/cr3.h"

#include <algorithm>
#include <array>

#include "platform/images/exif.h"
#include "platform/images/iso_boxes.h"
#include "platform/images/jpeg.h"

namespace brivo::images {

namespace {

constexpr FourCharacters kUuid = fourCharacters("uuid");
/// The box with what the camera says, in the movie box.
constexpr std::array<std::uint64_t, 2> kCamera{0x85C0B687820F11E0, 0x8111F4CE462B6A48};
/// The box with the preview, beside the movie box.
constexpr std::array<std::uint64_t, 2> kPreview{0xEAF42B5E1C984B88, 0xB9FBB7DC406E4D16};
/// Bytes in that box before the box inside it.
constexpr std::uint64_t kBeforePreview = 8;

bool isCr3(Parse& parse) {
  const auto brands = brandsOf(parse);
  return !brands.empty() && brands.front() == fourCharacters("crx ");
}

/// Reads the first directory of a block; the camera gives each kind of directory a block of its own.
using DirectoryReader = void (*)(TiffBlock&, const TiffDirectory&);

void readBlock(Parse& parse, const Box& box, DirectoryReader reader) {
  auto block = TiffBlock::at(parse, box.start, box.length);
  if (block) reader(*block, block->directory(block->firstDirectory()));
}

PixelSize sizeIn(const TiffBlock& block, const TiffDirectory& directory) {
  const auto width = block.number(directory, tag::kImageWidth);
  const auto height = block.number(directory, tag::kImageLength);
  if (!width || !height) return {};
  return {static_cast<std::uint32_t>(*width), static_cast<std::uint32_t>(*height)};
}

/// CMT1: what the first directory of a TIFF file says.
void readMain(TiffBlock& block, const TiffDirectory& directory) {
  setOnce(block.parse().found.size, sizeIn(block, directory));
  readMainDirectory(block, directory);
  if (directory.next != 0) readThumbnail(block, block.directory(directory.next));
}

/// The JPEG that ends a box, behind a header whose length differs between cameras.
struct JpegPart {
  std::uint64_t offset = 0;
  std::uint64_t length = 0;
};

JpegPart jpegIn(Parse& parse, const Box& box) {
  constexpr std::size_t kLongestHeader = 64;
  constexpr std::array kStart{std::byte{0xFF}, std::byte{0xD8}, std::byte{0xFF}};
  const auto head = parse.ranges.upTo(
      box.start, static_cast<std::size_t>(std::min<std::uint64_t>(box.length, kLongestHeader)));
  const auto start = std::search(head.begin(), head.end(), kStart.begin(), kStart.end());
  if (start == head.end()) return {};
  const auto before = static_cast<std::uint64_t>(start - head.begin());
  return {box.start + before, box.length - before};
}

void readThumbnailBox(Parse& parse, const Box& box) {
  const auto [offset, length] = jpegIn(parse, box);
  if (!parse.found.thumbnail) parse.found.thumbnail = jpegAt(parse, offset, length);
  if (parse.scope == Scope::previews) addEmbeddedJpeg(parse, offset, length);
}

void readCameraBox(Parse& parse, const Box& camera) {
  Boxes boxes(parse, camera);
  while (const auto box = boxes.next()) {
    if (box->type == fourCharacters("CMT1")) readBlock(parse, *box, readMain);
    if (box->type == fourCharacters("THMB")) readThumbnailBox(parse, *box);
    if (parse.scope == Scope::previews) continue;
    if (box->type == fourCharacters("CMT2")) readBlock(parse, *box, readExifDirectory);
    if (box->type == fourCharacters("CMT4") && parse.scope == Scope::all)
      readBlock(parse, *box, readGpsDirectory);
  }
}

/// The first track is the finished picture, as one JPEG.
void readMovie(Parse& parse, const Box& movie) {
  Boxes boxes(parse, movie);
  while (const auto box = boxes.next()) {
    if (box->type == kUuid && box->uuid == kCamera) readCameraBox(parse, *box);
  }
  const PictureTrack track = firstTrack(parse, movie);
  setOnce(parse.found.size, track.size);
  parse.found.crop = parse.found.size;
  if (parse.scope == Scope::previews)
    addEmbeddedJpeg(parse, track.sampleOffset, track.sampleLength, track.size);
}

void readPreviewBox(Parse& parse, const Box& box) {
  const auto [offset, length] = jpegIn(parse, childOf(parse, box, fourCharacters("PRVW"), kBeforePreview));
  addEmbeddedJpeg(parse, offset, length);
}

}  // namespace

bool readCr3File(Parse& parse) {
  if (!isCr3(parse)) return false;
  parse.ranges.allow(kForDirectories);
  bool hasMovie = false;
  Boxes boxes(parse);
  // Nothing but previews stands behind the movie box, and the pictures behind them are not worth a fetch.
  while (!hasMovie || parse.scope == Scope::previews) {
    const auto box = boxes.next();
    if (!box || box->type == fourCharacters("mdat")) break;
    if (box->type == fourCharacters("moov")) {
      readMovie(parse, *box);
      hasMovie = true;
    } else if (box->type == kUuid && box->uuid == kPreview && parse.scope == Scope::previews) {
      readPreviewBox(parse, *box);
    }
  }
  return true;
}

}  // namespace brivo::images
