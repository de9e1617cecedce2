// SPDX-License-Identifier: MIT
#include "platform/images/mrw.h"

#include <algorithm>
#include <bit>
#include <optional>
#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/exif.h"
#include "platform/images/jpeg.h"

namespace brivo::images {

namespace {

using namespace std::string_view_literals;
constexpr std::string_view kSignature = "\0MRM"sv;
constexpr std::string_view kLittleEndianSignature = "\0MRI"sv;
constexpr std::string_view kSizes = "\0PRD"sv;
constexpr std::string_view kTiff = "\0TTW"sv;
constexpr std::uint64_t kHeader = 8;

constexpr std::uint16_t kPreviewOffset = 0x0088;
constexpr std::uint16_t kPreviewLength = 0x0089;

std::optional<std::endian> byteOrderOf(std::string_view signature) {
  if (signature == kSignature) return std::endian::big;
  return signature == kLittleEndianSignature ? std::optional(std::endian::little) : std::nullopt;
}

/// The block at `offset`.
std::optional<Chunk> blockAt(Parse& parse, std::uint64_t offset, std::endian order) {
  if (!parse.spendDirectory()) return std::nullopt;
  ByteCursor cursor(parse.ranges.bytes(offset, kHeader), order);
  Chunk block;
  block.type = lettersOf(cursor.take(4));
  block.length = cursor.u32();
  block.start = offset + kHeader;
  return cursor.ok() ? std::optional(block) : std::nullopt;
}

/// The version, then height and width of the sensor and of the image, bytes that tell nothing, and bits.
void readSizes(Parse& parse, const Chunk& block, std::endian order) {
  constexpr std::size_t kBytes = 18;
  ByteCursor cursor(parse.ranges.bytes(block.start, kBytes), order);
  cursor.seek(12);
  PixelSize size;
  size.height = cursor.u16();
  size.width = cursor.u16();
  cursor.skip(1);  // bits that a sample takes in the file
  const std::uint8_t depth = cursor.u8();
  if (!cursor.ok() || !size) return;
  parse.found.size = parse.found.crop = size;
  parse.found.depth = depth;
}

void keepJpeg(Parse& parse, std::uint64_t offset, std::uint64_t length) {
  if (parse.scope == Scope::previews) {
    addEmbeddedJpeg(parse, offset, length);
  } else if (!parse.found.thumbnail) {
    parse.found.thumbnail = jpegAt(parse, offset, length);
  }
}

/// The maker note is a directory whose offsets count from the start of the block, and names a small JPEG.
void readMakerNotePreview(Parse& parse, const Chunk& block) {
  auto tiff = TiffBlock::at(parse, block.start, block.length);
  if (!tiff) return;
  const auto exif = tiff->number(tiff->directory(tiff->firstDirectory()), tag::kExifDirectory);
  if (!exif) return;
  const TiffDirectory exifDirectory = tiff->directory(*exif);
  const TiffEntry* note = exifDirectory.find(tag::kMakerNote);
  if (!note) return;
  const TiffDirectory makerNote = tiff->directory(note->position);
  const auto offset = tiff->number(makerNote, kPreviewOffset);
  const auto length = tiff->number(makerNote, kPreviewLength);
  if (offset && length && *offset <= tiff->length()) keepJpeg(parse, tiff->start() + *offset, *length);
}

void readTiff(Parse& parse, const Chunk& block) {
  auto tiff = TiffBlock::at(parse, block.start, block.length);
  if (!tiff) return;
  readExif(*tiff);
  if (const EmbeddedImage thumbnail = parse.found.thumbnail)
    keepJpeg(parse, thumbnail.offset, thumbnail.length);
  readMakerNotePreview(parse, block);
}

}  // namespace

bool readMrw(Parse& parse) {
  ByteCursor cursor(parse.ranges.upTo(0, kHeader));
  const auto order = byteOrderOf(lettersOf(cursor.take(kSignature.size())));
  if (!order) return false;
  cursor.setOrder(*order);
  parse.ranges.allow(kForDirectories);
  const std::uint64_t end = kHeader + cursor.u32();
  for (std::uint64_t at = kHeader; at < end;) {
    const auto block = blockAt(parse, at, *order);
    if (!block) break;
    if (block->type == kSizes) readSizes(parse, *block, *order);
    if (block->type == kTiff) readTiff(parse, *block);
    at = block->start + block->length;
  }
  return true;
}

}  // namespace brivo::images
