// SPDX-License-Identifier: MIT
#include "platform/images/tiff_block.h"

#include <algorithm>
#include <array>

#include "platform/base/byte_cursor.h"

namespace brivo::images {

namespace {

constexpr std::uint16_t kTiffMagic = 42;
constexpr std::uint16_t kBigTiffMagic = 43;
/// What raw files of the ORF, RW2 and RWL kinds have in the place of 42: "RO", "RS" and "U".
constexpr std::array<std::uint16_t, 3> kRawMagics{0x4F52, 0x5352, 0x0055};

constexpr std::size_t kEntryBytes = 12;
constexpr std::size_t kBigEntryBytes = 20;

}  // namespace

std::size_t sizeOfTiffType(TiffType type) {
  switch (type) {
    case TiffType::byte:
    case TiffType::ascii:
    case TiffType::signedByte:
    case TiffType::undefined:
    case TiffType::utf8:
      return 1;
    case TiffType::shortInteger:
    case TiffType::signedShort:
      return 2;
    case TiffType::longInteger:
    case TiffType::signedLong:
    case TiffType::real32:
    case TiffType::directory:
      return 4;
    case TiffType::rational:
    case TiffType::signedRational:
    case TiffType::real64:
    case TiffType::long64:
    case TiffType::signedLong64:
    case TiffType::directory64:
      return 8;
  }
  return 0;
}

const TiffEntry* TiffDirectory::find(std::uint16_t tag) const {
  const auto place = std::ranges::find(entries, tag, &TiffEntry::tag);
  return place == entries.end() ? nullptr : &*place;
}

TiffBlock::TiffBlock(Parse& parse, std::uint64_t start, std::uint64_t length, std::endian order, bool big)
    : parse_(&parse),
      start_(std::min(start, parse.ranges.size())),
      length_(std::min(length, parse.ranges.size() - start_)),
      order_(order),
      big_(big) {}

std::optional<TiffBlock> TiffBlock::at(Parse& parse, std::uint64_t start, std::uint64_t length) {
  const auto header = parse.ranges.upTo(start, static_cast<std::size_t>(std::min<std::uint64_t>(length, 16)));
  ByteCursor cursor(header);
  const std::uint16_t mark = cursor.u16();
  if (mark != 0x4949 && mark != 0x4D4D) return std::nullopt;
  const std::endian order = mark == 0x4949 ? std::endian::little : std::endian::big;
  cursor.setOrder(order);
  const std::uint16_t magic = cursor.u16();
  const bool big = magic == kBigTiffMagic;
  if (!big && magic != kTiffMagic && std::ranges::find(kRawMagics, magic) == kRawMagics.end())
    return std::nullopt;
  TiffBlock block(parse, start, length, order, big);
  block.magic_ = magic;
  if (big) cursor.skip(4);  // the size of offsets, which is always 8, and a zero
  block.firstDirectory_ = big ? cursor.u64() : cursor.u32();
  return cursor.ok() ? std::optional(std::move(block)) : std::nullopt;
}

TiffDirectory TiffBlock::directory(std::uint64_t offset) {
  TiffDirectory directory;
  const std::size_t countBytes = big_ ? 8 : 2;
  const std::size_t entryBytes = big_ ? kBigEntryBytes : kEntryBytes;
  const std::size_t inlineBytes = big_ ? 8 : 4;
  if (offset >= length_ || std::ranges::find(seen_, offset) != seen_.end() || !parse_->spendDirectory())
    return directory;
  seen_.push_back(offset);
  ByteCursor head(parse_->ranges.bytes(start_ + offset, countBytes), order_);
  const std::uint64_t stated = big_ ? head.u64() : head.u16();
  const std::uint64_t room = (length_ - offset) / entryBytes;
  const std::size_t count = parse_->spendEntries(std::min(stated, room));
  if (count == 0) return directory;
  // The link to the next directory stands behind the entries, if the file goes that far.
  const std::uint64_t first = offset + countBytes;
  const auto raw = parse_->ranges.upTo(start_ + first, count * entryBytes + inlineBytes);
  ByteCursor cursor(raw, order_);
  directory.entries.reserve(std::min(count, raw.size() / entryBytes));
  for (std::size_t i = 0; i < count && cursor.remaining() >= entryBytes; ++i) {
    TiffEntry entry;
    entry.tag = cursor.u16();
    entry.type = TiffType{cursor.u16()};
    entry.count = big_ ? cursor.u64() : cursor.u32();
    const std::uint64_t place = first + i * entryBytes + entryBytes - inlineBytes;
    const std::uint64_t pointed = big_ ? cursor.u64() : cursor.u32();
    const std::size_t size = sizeOfTiffType(entry.type);
    if (size == 0 || entry.count > length_ / size) continue;
    entry.length = entry.count * size;
    entry.position = entry.length <= inlineBytes ? place : pointed;
    directory.entries.push_back(entry);
  }
  if (count == stated) directory.next = big_ ? cursor.u64() : cursor.u32();
  return directory;
}

std::span<const std::byte> TiffBlock::bytes(const TiffEntry& entry) const {
  return bytes(entry, entry.length);
}

std::span<const std::byte> TiffBlock::bytes(const TiffEntry& entry, std::size_t most) const {
  if (entry.position > length_ || entry.length > length_ - entry.position) return {};
  return parse_->ranges.bytes(start_ + entry.position,
                              static_cast<std::size_t>(std::min<std::uint64_t>(entry.length, most)));
}

std::optional<std::uint64_t> TiffBlock::number(const TiffEntry& entry, std::uint64_t index) const {
  const std::size_t size = sizeOfTiffType(entry.type);
  const bool isInteger = entry.type != TiffType::ascii && entry.type != TiffType::rational &&
                         entry.type != TiffType::signedRational && entry.type != TiffType::real32 &&
                         entry.type != TiffType::real64 && entry.type != TiffType::utf8;
  if (!isInteger || index >= entry.count) return std::nullopt;
  TiffEntry element = entry;
  element.position += index * size;
  element.length = size;
  ByteCursor cursor(bytes(element), order_);
  const std::uint64_t value = size == 1   ? cursor.u8()
                              : size == 2 ? cursor.u16()
                              : size == 4 ? cursor.u32()
                                          : cursor.u64();
  return cursor.ok() ? std::optional(value) : std::nullopt;
}

std::optional<std::uint64_t> TiffBlock::number(const TiffDirectory& directory, std::uint16_t tag) const {
  const TiffEntry* entry = directory.find(tag);
  return entry ? number(*entry) : std::nullopt;
}

std::string_view TiffBlock::text(const TiffEntry& entry) const {
  const auto raw = bytes(entry, ExifEntries::kLongestValue);
  const std::string_view text(reinterpret_cast<const char*>(raw.data()), raw.size());
  return text.substr(0, text.find('\0'));
}

}  // namespace brivo::images
