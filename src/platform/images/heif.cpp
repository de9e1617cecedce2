// SPDX-License-Identifier: MIT
#include "platform/images/heif.h"

#include <algorithm>
#include <array>

#include "platform/images/exif.h"
#include "platform/images/heif_items.h"
#include "platform/images/iso_boxes.h"
#include "platform/images/jpeg.h"

namespace brivo::images {

namespace {

constexpr FourCharacters kExif = fourCharacters("Exif");
constexpr FourCharacters kJpeg = fourCharacters("jpeg");

/// Brands of pictures and of sequences of pictures.
constexpr std::array kBrands{fourCharacters("mif1"), fourCharacters("mif2"), fourCharacters("miaf"),
                             fourCharacters("heic"), fourCharacters("heix"), fourCharacters("heim"),
                             fourCharacters("heis"), fourCharacters("avif"), fourCharacters("avci"),
                             fourCharacters("jpeg"), fourCharacters("msf1"), fourCharacters("hevc"),
                             fourCharacters("hevx"), fourCharacters("hevm"), fourCharacters("hevs"),
                             fourCharacters("avis"), fourCharacters("avcs"), fourCharacters("jpgs")};

/// How a stored picture is turned, as a mirroring of left and right that may come first and quarter-turns
/// clockwise.
class Turning {
 public:
  /// irot: quarter-turns anticlockwise.
  void turn(unsigned quarters) { turns_ = (turns_ + 4 - quarters % 4) % 4; }
  /// imir: 0 exchanges top and bottom, 1 left and right. A mirroring behind turns is one before turns the
  /// other way round, and one of top and bottom is one of left and right with half a turn.
  void mirror(unsigned axis) {
    isMirrored_ = !isMirrored_;
    turns_ = (4 - turns_ + (axis % 2 == 0 ? 2 : 0)) % 4;
  }
  /// The same as EXIF says it.
  std::uint16_t orientation() const {
    constexpr std::array<std::uint16_t, 4> kTurned{1, 6, 3, 8};
    constexpr std::array<std::uint16_t, 4> kMirrored{2, 7, 4, 5};
    return isMirrored_ ? kMirrored[turns_] : kTurned[turns_];
  }

 private:
  bool isMirrored_ = false;
  unsigned turns_ = 0;
};

/// What the properties of an item say of its picture.
struct Picture {
  PixelSize size;
  std::uint16_t depth = 0;
  std::uint16_t codecDepth = 0;  ///< what the decoder is told, if the picture does not say it itself
  Turning turning;
};

/// ispe
void readExtents(Picture& picture, ByteCursor cursor) {
  fullBoxHeader(cursor);
  const std::uint32_t width = cursor.u32();
  setOnce(picture.size, {width, cursor.u32()});
}

/// pixi
void readChannels(Picture& picture, ByteCursor cursor) {
  fullBoxHeader(cursor);
  cursor.skip(1);  // channels
  setOnce(picture.depth, cursor.u8());
}

/// hvcC (ISO/IEC 14496-15): bit_depth_luma_minus8
void readHevcConfiguration(Picture& picture, ByteCursor cursor) {
  cursor.skip(17);
  const std::uint8_t depth = cursor.u8();
  if (cursor.ok()) setOnce(picture.codecDepth, 8 + (depth & 7));
}

/// av1C: high_bitdepth and twelve_bit
void readAv1Configuration(Picture& picture, ByteCursor cursor) {
  cursor.skip(2);
  const std::uint8_t flags = cursor.u8();
  if (cursor.ok()) setOnce(picture.codecDepth, (flags & 0x40) == 0 ? 8 : (flags & 0x20) == 0 ? 10 : 12);
}

void readProperty(Picture& picture, FourCharacters type, ByteCursor cursor) {
  switch (type) {
    case fourCharacters("ispe"):
      return readExtents(picture, cursor);
    case fourCharacters("pixi"):
      return readChannels(picture, cursor);
    case fourCharacters("hvcC"):
      return readHevcConfiguration(picture, cursor);
    case fourCharacters("av1C"):
      return readAv1Configuration(picture, cursor);
    case fourCharacters("irot"):
      return picture.turning.turn(cursor.u8());
    case fourCharacters("imir"):
      return picture.turning.mirror(cursor.u8());
    default:
      return;
  }
}

Picture pictureOf(Parse& parse, const HeifItems& items, std::uint32_t item) {
  constexpr std::size_t kMostBytes = 32;
  Picture picture;
  for (const Box& property : items.propertiesOf(item)) {
    const ByteCursor cursor = contentOf(parse, property, kMostBytes);
    if (cursor.remaining() != 0) readProperty(picture, property.type, cursor);
  }
  setOnce(picture.depth, picture.codecDepth);
  return picture;
}

/// A picture that is put together from others often leaves it to them to say how deep they are.
std::uint16_t depthOfFirstPart(Parse& parse, const HeifItems& items, std::uint32_t item) {
  const auto parts = items.referencesOf(fourCharacters("dimg"), item);
  return parts.empty() ? std::uint16_t{0} : pictureOf(parse, items, parts.front()).depth;
}

void readPrimary(Parse& parse, const HeifItems& items, std::uint32_t item) {
  const Picture picture = pictureOf(parse, items, item);
  setOnce(parse.found.size, picture.size);
  setOnce(parse.found.depth, picture.depth);
  if (parse.found.depth == 0) parse.found.depth = depthOfFirstPart(parse, items, item);
  setOnce(parse.found.orientation, picture.turning.orientation());
}

bool refersTo(const HeifItems& items, FourCharacters kind, std::uint32_t from, std::uint32_t to) {
  const auto references = items.referencesOf(kind, from);
  return std::ranges::find(references, to) != references.end();
}

/// ISO/IEC 23008-12 annex A: where the TIFF header is, counted from behind this offset, and what it heads.
void readExifItem(Parse& parse, const HeifPlace& place) {
  constexpr std::uint64_t kOffsetBytes = 4;
  if (place.length < kOffsetBytes) return;
  ByteCursor cursor(parse.ranges.bytes(place.offset, kOffsetBytes), std::endian::big);
  const std::uint64_t before = kOffsetBytes + cursor.u32();
  if (!cursor.ok() || before > place.length) return;
  auto block = TiffBlock::at(parse, place.offset + before, place.length - before);
  if (block) readExif(*block);
}

/// The EXIF block that describes the picture, or the only one there is.
void readMetadata(Parse& parse, const HeifItems& items, const std::vector<HeifItem>& listed,
                  std::uint32_t picture) {
  auto chosen = std::ranges::find(listed, kExif, &HeifItem::type);
  const auto describing = std::ranges::find_if(listed, [&](const HeifItem& item) {
    return item.type == kExif && refersTo(items, fourCharacters("cdsc"), item.id, picture);
  });
  if (describing != listed.end()) chosen = describing;
  if (chosen != listed.end()) readExifItem(parse, items.placeOf(chosen->id));
}

/// A picture that is a JPEG is one that others can decode as it stands.
void readJpegItem(Parse& parse, const HeifItems& items, std::uint32_t item, std::uint32_t primary) {
  const bool isThumbnail = !parse.found.thumbnail && refersTo(items, fourCharacters("thmb"), item, primary);
  if (!isThumbnail && parse.scope != Scope::previews) return;
  const HeifPlace place = items.placeOf(item);
  if (!place.isWhole) return;
  if (isThumbnail) parse.found.thumbnail = jpegAt(parse, place.offset, place.length);
  if (parse.scope == Scope::previews) addEmbeddedJpeg(parse, place.offset, place.length);
}

void readMeta(Parse& parse, const Box& meta) {
  const HeifItems items(parse, meta);
  const auto primary = items.primary();
  if (!primary) return;
  // First, so that EXIF finds the orientation set: it does not count here.
  readPrimary(parse, items, *primary);
  const auto listed = items.itemsOf(kExif, kJpeg);
  readMetadata(parse, items, listed, *primary);
  for (const HeifItem& item : listed) {
    if (item.type == kJpeg) readJpegItem(parse, items, item.id, *primary);
  }
}

}  // namespace

bool isHeif(Parse& parse) {
  return std::ranges::any_of(brandsOf(parse), [](FourCharacters brand) {
    return std::ranges::find(kBrands, brand) != kBrands.end();
  });
}

bool readHeifFile(Parse& parse) {
  if (!isHeif(parse)) return false;
  parse.ranges.allow(kForDirectories);
  Box movie;
  Boxes boxes(parse);
  while (const auto box = boxes.next()) {
    if (box->type == fourCharacters("moov")) movie = *box;
    if (box->type != fourCharacters("meta")) continue;
    readMeta(parse, *box);
    return true;
  }
  setOnce(parse.found.size, firstTrack(parse, movie).size);
  return true;
}

}  // namespace brivo::images
