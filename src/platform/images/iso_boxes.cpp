// SPDX-License-Identifier: MIT
#include "platform/images/iso_boxes.h"

#include <algorithm>

namespace brivo::images {

namespace {

constexpr FourCharacters kUuid = fourCharacters("uuid");
constexpr std::size_t kLongestHeader = 32;  // with a 64-bit size and an extended type

/// A size of 1 stands for a 64-bit one behind the type, and 0 for all that is left.
std::uint64_t sizeOfBox(ByteCursor& cursor, std::uint32_t stated, std::uint64_t room) {
  return stated == 0 ? room : stated == 1 ? cursor.u64() : stated;
}

PixelSize sizeOfFirstEntry(Parse& parse, const Box& table) {
  constexpr std::size_t kBefore = 24;  // of a visual sample entry, before its width
  constexpr std::size_t kCountBytes = 4;
  const auto entry = Boxes(parse, table, kFullBoxBytes + kCountBytes).next();
  if (!entry) return {};
  ByteCursor cursor = contentOf(parse, *entry, kBefore + 4);
  cursor.skip(kBefore);
  const std::uint16_t width = cursor.u16();
  return {width, cursor.u16()};
}

std::uint32_t lengthOfFirstSample(Parse& parse, const Box& table) {
  ByteCursor cursor = contentOf(parse, table, kFullBoxBytes + 12);
  fullBoxHeader(cursor);
  const std::uint32_t common = cursor.u32();
  cursor.skip(4);  // samples
  return common != 0 ? common : cursor.u32();
}

std::uint64_t firstChunk(Parse& parse, const Box& samples) {
  constexpr std::size_t kBefore = kFullBoxBytes + 4;  // the count of chunks
  const Box wide = childOf(parse, samples, fourCharacters("co64"));
  ByteCursor cursor = contentOf(
      parse, wide.length != 0 ? wide : childOf(parse, samples, fourCharacters("stco")), kBefore + 8);
  cursor.skip(kBefore);
  return wide.length != 0 ? cursor.u64() : cursor.u32();
}

}  // namespace

Boxes::Boxes(Parse& parse, const Box& holder, std::uint64_t before)
    : parse_(parse),
      next_(holder.start + std::min(before, holder.length)),
      end_(holder.start + holder.length) {}

std::optional<Box> Boxes::next() {
  if (next_ >= end_ || parse_.spendEntries(1) == 0) return std::nullopt;
  const std::uint64_t room = end_ - next_;
  ByteCursor cursor(
      parse_.ranges.upTo(next_, static_cast<std::size_t>(std::min<std::uint64_t>(room, kLongestHeader))),
      std::endian::big);
  const std::uint32_t stated = cursor.u32();
  Box box;
  box.type = cursor.u32();
  const std::uint64_t size = std::min(sizeOfBox(cursor, stated, room), room);
  if (box.type == kUuid) box.uuid = {cursor.u64(), cursor.u64()};
  if (!cursor.ok() || size < cursor.position()) return std::nullopt;
  box.start = next_ + cursor.position();
  box.length = size - cursor.position();
  next_ += size;
  return box;
}

Box childOf(Parse& parse, const Box& holder, FourCharacters type, std::uint64_t before) {
  Boxes boxes(parse, holder, before);
  while (const auto box = boxes.next()) {
    if (box->type == type) return *box;
  }
  return {};
}

ByteCursor contentOf(Parse& parse, const Box& box, std::size_t most) {
  const auto length = static_cast<std::size_t>(std::min<std::uint64_t>(box.length, most));
  return ByteCursor(parse.ranges.upTo(box.start, length), std::endian::big);
}

FullBoxHeader fullBoxHeader(ByteCursor& cursor) {
  const std::uint8_t version = cursor.u8();
  const std::uint32_t high = cursor.u8();
  return {version, high << 16 | cursor.u16()};
}

std::vector<FourCharacters> brandsOf(Parse& parse) {
  constexpr std::size_t kMostBytes = 256;
  constexpr std::size_t kBrandBytes = 4;
  const auto type = Boxes(parse).next();
  if (!type || type->type != fourCharacters("ftyp")) return {};
  ByteCursor cursor = contentOf(parse, *type, kMostBytes);
  std::vector<FourCharacters> brands{cursor.u32()};
  cursor.skip(4);  // the minor version
  while (cursor.remaining() >= kBrandBytes) brands.push_back(cursor.u32());
  return brands;
}

PictureTrack firstTrack(Parse& parse, const Box& movie) {
  Box samples = childOf(parse, movie, fourCharacters("trak"));
  for (const auto* type : {"mdia", "minf", "stbl"}) samples = childOf(parse, samples, fourCharacters(type));
  return {sizeOfFirstEntry(parse, childOf(parse, samples, fourCharacters("stsd"))),
          firstChunk(parse, samples),
          lengthOfFirstSample(parse, childOf(parse, samples, fourCharacters("stsz")))};
}

}  // namespace brivo::images
