// SPDX-License-Identifier: MIT
#include "platform/images/exif.h"

#include <algorithm>

#include "platform/base/byte_cursor.h"
#include "platform/images/exif_names.h"
#include "platform/images/jpeg.h"
#include "platform/images/maker_previews.h"

namespace brivo::images {

namespace {

void keepEntry(const TiffBlock& block, const TiffEntry& entry, ExifGroup group) {
  if (entry.length > ExifEntries::kLongestValue) return;
  block.parse().found.entries.add(group, entry.tag, static_cast<std::uint16_t>(entry.type),
                                  block.bytes(entry), block.order());
}

void keepEntries(const TiffBlock& block, const TiffDirectory& directory, ExifGroup group) {
  for (const TiffEntry& entry : directory.entries) {
    if (!nameOfTag(group, entry.tag).empty()) keepEntry(block, entry, group);
  }
}

/// A tag that TIFF and EXIF both know belongs to TIFF here.
void keepMainEntries(const TiffBlock& block, const TiffDirectory& directory) {
  keepEntries(block, directory, ExifGroup::tiff);
  for (const TiffEntry& entry : directory.entries) {
    if (!nameOfTag(ExifGroup::exif, entry.tag).empty() && nameOfTag(ExifGroup::tiff, entry.tag).empty())
      keepEntry(block, entry, ExifGroup::exif);
  }
}

TiffDirectory namedDirectory(TiffBlock& block, const TiffDirectory& directory, std::uint16_t tag) {
  const std::uint64_t offset = block.number(directory, tag).value_or(0);
  return offset != 0 ? block.directory(offset) : TiffDirectory();
}

}  // namespace

void readExif(TiffBlock& block) {
  const TiffDirectory main = block.directory(block.firstDirectory());
  readMainDirectory(block, main);
  if (main.next != 0) readThumbnail(block, block.directory(main.next));
  if (block.parse().scope == Scope::previews) readMakerPreviews(block, main);
}

void readMainDirectory(TiffBlock& block, const TiffDirectory& directory) {
  Parse& parse = block.parse();
  if (const auto stated = block.number(directory, tag::kOrientation)) {
    setOnce(parse.found.orientation, isOrientation(*stated) ? *stated : 1);
  }
  if (parse.scope == Scope::previews) return;
  readExifDirectory(block, namedDirectory(block, directory, tag::kExifDirectory));
  keepMainEntries(block, directory);
  if (parse.scope == Scope::all)
    readGpsDirectory(block, namedDirectory(block, directory, tag::kGpsDirectory));
}

void readExifDirectory(TiffBlock& block, const TiffDirectory& directory) {
  keepEntries(block, directory, ExifGroup::exif);
  if (const TiffEntry* note = directory.find(tag::kMakerNote))
    readMakerNoteDictionary(block.parse(), block.start() + note->position, note->length);
}

void readGpsDirectory(TiffBlock& block, const TiffDirectory& directory) {
  keepEntries(block, directory, ExifGroup::gps);
}

void readThumbnail(TiffBlock& block, const TiffDirectory& directory) {
  Parse& parse = block.parse();
  const auto offset = block.number(directory, tag::kJpegOffset);
  const auto length = block.number(directory, tag::kJpegLength);
  if (!offset || !length || *offset > block.length()) return;
  if (const EmbeddedImage image = jpegAt(parse, block.start() + *offset, *length))
    parse.found.thumbnail = image;
  if (parse.scope == Scope::previews) addNamedJpeg(block, directory, tag::kJpegOffset, tag::kJpegLength);
}

void readMakerPreviews(TiffBlock& block, const TiffDirectory& main) {
  const TiffDirectory exif = namedDirectory(block, main, tag::kExifDirectory);
  const TiffEntry* note = exif.find(tag::kMakerNote);
  const TiffEntry* make = main.find(tag::kMake);
  if (!note) return;
  readMakerPreviews(block.parse(), {block.start() + note->position, note->length, block.start(),
                                    make ? block.text(*make) : std::string_view()});
}

PixelSize statedSize(const TiffBlock& block, const TiffDirectory& directory) {
  return pixelSize(block.number(directory, tag::kImageWidth).value_or(0),
                   block.number(directory, tag::kImageLength).value_or(0));
}

void addNamedJpeg(const TiffBlock& block, const TiffDirectory& directory, std::uint16_t offsetTag,
                  std::uint16_t lengthTag) {
  const auto offset = block.number(directory, offsetTag);
  const auto length = block.number(directory, lengthTag);
  const std::uint64_t orientation = block.number(directory, tag::kOrientation).value_or(0);
  if (!offset || !length || *offset > block.length()) return;
  addEmbeddedJpeg(block.parse(), block.start() + *offset, *length, statedSize(block, directory),
                  isOrientation(orientation) ? static_cast<std::uint16_t>(orientation) : std::uint16_t{0});
}

void readMakerNoteDictionary(Parse& parse, std::uint64_t start, std::uint64_t length) {
  constexpr std::size_t kLongestHeader = 32;
  const auto header =
      parse.ranges.upTo(start, static_cast<std::size_t>(std::min<std::uint64_t>(length, kLongestHeader)));
  const auto isPrintable = [](std::byte byte) { return byte >= std::byte{0x20} && byte < std::byte{0x7F}; };
  const auto signature = std::ranges::find_if_not(header, isPrintable);
  const auto version =
      std::ranges::find_if(signature, header.end(), [](std::byte b) { return b != std::byte{0}; });
  // The zero before the version's 1 belongs to the version, and one more ends the signature.
  if (signature == header.begin() || version - signature < 2) return;
  ByteCursor cursor(header);
  cursor.seek(static_cast<std::size_t>(version - header.begin()));
  const bool isVersion1 = cursor.u8() == 1;
  const std::uint16_t mark = cursor.u16();
  if (!isVersion1 || !cursor.ok() || (mark != 0x4949 && mark != 0x4D4D)) return;
  const std::endian order = mark == 0x4949 ? std::endian::little : std::endian::big;
  TiffBlock note(parse, start, length, order);
  const TiffDirectory directory = note.directory(cursor.position());
  for (const TiffEntry& entry : directory.entries) keepEntry(note, entry, ExifGroup::makerNote);
}

}  // namespace brivo::images
