// SPDX-License-Identifier: MIT
#include "platform/images/x3f.h"

#include <algorithm>
#include <bit>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/jpeg.h"
#include "platform/images/raw_preview.h"
#include "platform/images/stated_facts.h"
#include "platform/images/x3f_properties.h"

namespace brivo::images {

namespace {

constexpr std::string_view kSignature = "FOVb";
constexpr std::uint64_t kPointerBytes = 4;
constexpr std::uint64_t kTail = 16'384;
constexpr std::size_t kEntryBytes = 12;
constexpr std::uint64_t kImageHeader = 28;
constexpr std::uint32_t kJpegFormat = 18;
constexpr std::uint32_t kWidestThumbnail = 1024;

struct Header {
  PixelSize size;
  std::int32_t degrees = 0;  ///< clockwise
};

/// Since version 4.0 the numbers stand three places further on.
Header readHeader(Parse& parse) {
  constexpr std::size_t kVersionAt = 4, kSizeAt = 28, kLaterSizeAt = 40, kMostBytes = 52;
  ByteCursor cursor(parse.ranges.upTo(0, kMostBytes));
  cursor.seek(kVersionAt);
  const std::uint32_t version = cursor.u32() >> 16;
  cursor.seek(version >= 4 ? kLaterSizeAt : kSizeAt);
  Header header;
  header.size.width = cursor.u32();
  header.size.height = cursor.u32();
  header.degrees = std::bit_cast<std::int32_t>(cursor.u32());
  return cursor.ok() ? header : Header();
}

/// The last four bytes of the file say where the directory is.
std::vector<Chunk> sectionsOf(Parse& parse) {
  std::vector<Chunk> sections;
  const std::uint64_t end = parse.ranges.size();
  // One range for the directory and what lies before it, as the properties often do.
  (void)parse.ranges.upTo(end - std::min(end, kTail), kTail);
  ByteCursor pointer(parse.ranges.bytes(end - std::min(end, kPointerBytes), kPointerBytes));
  const std::uint64_t directory = pointer.u32();
  ByteCursor head(parse.ranges.bytes(directory, kEntryBytes));
  const bool isDirectory = lettersOf(head.take(4)) == "SECd";
  head.skip(4);  // version
  const std::uint32_t stated = head.u32();
  if (!pointer.ok() || !isDirectory) return sections;
  const std::size_t count = parse.spendEntries(std::min<std::uint64_t>(stated, kTail / kEntryBytes));
  ByteCursor cursor(parse.ranges.upTo(directory + kEntryBytes, count * kEntryBytes));
  while (cursor.remaining() >= kEntryBytes) {
    Chunk section;
    section.start = cursor.u32();
    section.length = cursor.u32();
    section.type = lettersOf(cursor.take(4));
    sections.push_back(section);
  }
  return sections;
}

/// The JPEG of an image section, with the size that the section states; empty for any other section.
EmbeddedImage statedJpeg(Parse& parse, const Chunk& section) {
  const bool isImage = section.type == "IMA2" || section.type == "IMAG";
  if (!isImage || section.length < kImageHeader) return {};
  ByteCursor cursor(parse.ranges.bytes(section.start, kImageHeader));
  cursor.seek(12);
  if (cursor.u32() != kJpegFormat || !cursor.ok()) return {};
  EmbeddedImage image{section.start + kImageHeader, section.length - kImageHeader, {}, 0};
  image.size.width = cursor.u32();
  image.size.height = cursor.u32();
  return image;
}

/// The smaller sections come first, so that what may be fetched is not spent on the raw image.
void readImages(Parse& parse, std::vector<Chunk> sections) {
  const bool findsAll = parse.scope == Scope::previews;
  std::ranges::stable_sort(sections, {}, &Chunk::length);
  EmbeddedImage small;
  for (const Chunk& section : sections) {
    if (!findsAll && !parse.found.entries.empty()) break;
    const EmbeddedImage image = statedJpeg(parse, section);
    if (!image) continue;
    readRawPreview(parse, image.offset, image.length, image.size);
    if (!small && image.size.width <= kWidestThumbnail) small = jpegAt(parse, image.offset, image.length);
  }
  if (!parse.found.thumbnail) parse.found.thumbnail = small;
}

void readProperties(Parse& parse, const std::vector<Chunk>& sections) {
  const auto properties = std::ranges::find(sections, "PROP", &Chunk::type);
  if (properties != sections.end()) readX3fProperties(parse, properties->start, properties->length);
}

}  // namespace

bool readX3f(Parse& parse) {
  if (lettersOf(parse.ranges.upTo(0, kSignature.size())) != kSignature) return false;
  parse.ranges.allow(kForDirectories);
  const Header header = readHeader(parse);
  parse.found.size = parse.found.crop = header.size;
  const std::vector<Chunk> sections = sectionsOf(parse);
  // The images may take all the ranges; but where one has EXIF, that says more.
  if (parse.scope != Scope::previews) readProperties(parse, sections);
  ExifEntries stated = std::exchange(parse.found.entries, ExifEntries());
  readImages(parse, sections);
  if (parse.found.entries.empty()) parse.found.entries = std::move(stated);
  setOnce(parse.found.orientation, orientationOfDegrees(header.degrees));
  return true;
}

}  // namespace brivo::images
