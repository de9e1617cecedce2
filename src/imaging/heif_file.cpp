// SPDX-License-Identifier: MIT
#include "imaging/heif_file.h"

#include <span>

#include "platform/images/heif.h"

namespace brivo::imaging {

namespace {

using images::Box;
using images::fourCharacters;
using images::Parse;

/// Longest coded picture; the largest photos have a tenth of it.
constexpr std::uint64_t kMostCodedBytes = std::uint64_t{1} << 28;

/// An empty box for what is no HEIF.
Box metaOf(Parse& parse) {
  if (!images::isHeif(parse)) return {};
  parse.ranges.allow(images::kForDirectories);
  return images::childOf(parse, Box{.length = parse.ranges.size()}, fourCharacters("meta"));
}

/// ispe
Extent extentOf(ByteCursor cursor) {
  images::fullBoxHeader(cursor);
  const std::uint32_t width = cursor.u32();
  return {width, cursor.u32()};
}

/// colr (ISO/IEC 14496-12 section 12.1.5), whose profile fills what is behind its kind.
void readColours(HeifPicture& picture, ByteCursor cursor, const Box& box) {
  const std::uint32_t kind = cursor.u32();
  if (!cursor.ok()) return;
  if (kind == fourCharacters("prof") || kind == fourCharacters("rICC")) {
    picture.iccProfile = {.start = box.start + cursor.position(), .length = box.length - cursor.position()};
  } else if (kind == fourCharacters("nclx")) {
    ColourCodes codes{cursor.u16(), cursor.u16(), cursor.u16()};
    codes.isFullRange = (cursor.u8() & 0x80) != 0;
    if (cursor.ok()) picture.colours = codes;
  }
}

void readProperty(HeifPicture& picture, const Box& box, ByteCursor cursor) {
  switch (box.type) {
    case fourCharacters("ispe"):
      picture.size = extentOf(cursor);
      return;
    case fourCharacters("hvcC"):
    case fourCharacters("av1C"):
      picture.configuration = box;
      return;
    case fourCharacters("colr"):
      readColours(picture, cursor, box);
      return;
    default:
      return;
  }
}

bool isIn(const images::ByteSource& source, std::uint64_t offset, std::uint64_t length) {
  return offset <= source.size() && length <= source.size() - offset;
}

}  // namespace

HeifFile::HeifFile(const images::ByteSource& source)
    : source_(source), parse_(source, images::Scope::basics), items_(parse_, metaOf(parse_)) {
  for (const images::HeifItem& item : items_.items()) types_.emplace(item.id, item.type);
}

std::optional<HeifPicture> HeifFile::primary() {
  const auto id = items_.primary();
  return id && types_.contains(*id) ? std::optional(picture(*id)) : std::nullopt;
}

std::vector<HeifPicture> HeifFile::thumbnailsOf(std::uint32_t master) {
  std::vector<HeifPicture> thumbnails;
  for (const std::uint32_t id : items_.referringTo(fourCharacters("thmb"), master))
    thumbnails.push_back(picture(id));
  return thumbnails;
}

std::vector<std::uint32_t> HeifFile::partsOf(std::uint32_t whole) const {
  return items_.referencesOf(fourCharacters("dimg"), whole);
}

HeifPicture HeifFile::picture(std::uint32_t id) {
  constexpr std::size_t kMostBytes = 16;
  const auto known = types_.find(id);
  HeifPicture picture;
  picture.id = id;
  if (known != types_.end()) picture.type = known->second;
  for (const Box& property : items_.propertiesOf(id))
    readProperty(picture, property, images::contentOf(parse_, property, kMostBytes));
  return picture;
}

Packet HeifFile::bytesOf(std::uint32_t item) const {
  const images::HeifPlace place = items_.placeOf(item);
  if (!place.isWhole || place.length > kMostCodedBytes || !isIn(source_, place.offset, place.length))
    return nullptr;
  Packet packet = makePacket(static_cast<std::size_t>(place.length));
  if (!packet) return nullptr;
  const auto room = std::as_writable_bytes(std::span(packet->data, static_cast<std::size_t>(packet->size)));
  return images::readAll(source_, room, place.offset) ? std::move(packet) : nullptr;
}

std::vector<std::byte> HeifFile::contentOf(const Box& box, std::size_t most) const {
  if (box.length > most || !isIn(source_, box.start, box.length)) return {};
  std::vector<std::byte> content(static_cast<std::size_t>(box.length));
  return images::readAll(source_, content, box.start) ? content : std::vector<std::byte>();
}

}  // namespace brivo::imaging
