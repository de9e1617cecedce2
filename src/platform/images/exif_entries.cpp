// SPDX-License-Identifier: MIT
#include "platform/images/exif_entries.h"

#include <algorithm>
#include <bit>
#include <charconv>
#include <string>

#include "platform/base/byte_cursor.h"
#include "platform/images/exif_names.h"
#include "platform/images/tiff_block.h"

namespace brivo::images {

namespace {

constexpr std::size_t kHeaderBytes = 6;

/// Bytes whose order depends on the byte order, which is half an element of a rational.
std::size_t unitOf(TiffType type) {
  const bool isRational = type == TiffType::rational || type == TiffType::signedRational;
  return isRational ? 4 : sizeOfTiffType(type);
}

bool isText(TiffType type) { return type == TiffType::ascii || type == TiffType::utf8; }

/// Text may hold several parts that NULs end, as "Copyright" does for photographer and editor.
std::string textOf(std::span<const std::byte> value) {
  std::string text(reinterpret_cast<const char*>(value.data()), value.size());
  text.erase(text.find_last_not_of('\0') + 1);
  for (char& character : text) {
    if (character == '\0') character = '\n';
  }
  return text;
}

Value elementOf(ByteCursor& cursor, TiffType type) {
  switch (type) {
    case TiffType::byte:
      return std::uint32_t{cursor.u8()};
    case TiffType::shortInteger:
      return std::uint32_t{cursor.u16()};
    case TiffType::signedByte:
      return std::int32_t{static_cast<std::int8_t>(cursor.u8())};
    case TiffType::signedShort:
      return std::int32_t{static_cast<std::int16_t>(cursor.u16())};
    case TiffType::signedLong:
      return static_cast<std::int32_t>(cursor.u32());
    case TiffType::rational: {
      const double numerator = cursor.u32();
      return numerator / cursor.u32();
    }
    case TiffType::signedRational: {
      const double numerator = static_cast<std::int32_t>(cursor.u32());
      return numerator / static_cast<std::int32_t>(cursor.u32());
    }
    case TiffType::real32:
      return double{std::bit_cast<float>(cursor.u32())};
    case TiffType::real64:
      return std::bit_cast<double>(cursor.u64());
    case TiffType::signedLong64:
      return static_cast<std::int64_t>(cursor.u64());
    case TiffType::long64:
    case TiffType::directory64:
      return cursor.u64();
    default:
      return cursor.u32();
  }
}

Value valueOf(TiffType type, std::span<const std::byte> bytes) {
  if (isText(type)) return textOf(bytes);
  if (type == TiffType::undefined) return Data::copyOf(bytes);
  const std::size_t count = bytes.size() / sizeOfTiffType(type);
  ByteCursor cursor(bytes);
  if (count == 1) return elementOf(cursor, type);
  Array elements;
  elements.reserve(count);
  for (std::size_t i = 0; i < count; ++i) elements.append(elementOf(cursor, type));
  return elements;
}

std::string nameOf(ExifGroup group, std::uint16_t tag) {
  return group == ExifGroup::makerNote ? std::to_string(tag) : std::string(nameOfTag(group, tag));
}

std::optional<std::uint16_t> tagOf(ExifGroup group, std::string_view name) {
  if (group != ExifGroup::makerNote) return tagOfName(group, name);
  std::uint16_t tag = 0;
  const auto [end, error] = std::from_chars(name.data(), name.data() + name.size(), tag);
  return error == std::errc() && end == name.data() + name.size() ? std::optional(tag) : std::nullopt;
}

}  // namespace

struct ExifEntries::Entry {
  ExifGroup group;
  TiffType type;
  std::uint16_t tag;
  std::span<const std::byte> value;
};

void ExifEntries::add(ExifGroup group, std::uint16_t tag, std::uint16_t type,
                      std::span<const std::byte> value, std::endian order) {
  const std::size_t unit = unitOf(TiffType{type});
  const bool hasName = group == ExifGroup::makerNote || !nameOfTag(group, tag).empty();
  const bool fits =
      value.size() <= kLongestValue && packed_.size() + kHeaderBytes + value.size() <= kMostBytes;
  if (!hasName || !fits || unit == 0 || value.empty()) return;
  if (packed_.empty()) packed_.reserve(1024);
  append({group, TiffType{type}, tag, value});
  if (order == std::endian::little || unit == 1) return;
  const auto packed = std::span(packed_).last(value.size());
  for (std::size_t at = 0; at + unit <= packed.size(); at += unit)
    std::ranges::reverse(packed.subspan(at, unit));
}

/// An entry is packed as its group, its type, its tag and the length of its value (two bytes each for the
/// last two), and its value; everything in little-endian order.
void ExifEntries::append(const Entry& entry) {
  const auto byte = [&](std::size_t value) { packed_.push_back(static_cast<std::byte>(value & 0xFF)); };
  byte(static_cast<std::size_t>(entry.group));
  byte(static_cast<std::size_t>(entry.type));
  byte(entry.tag);
  byte(entry.tag >> 8);
  byte(entry.value.size());
  byte(entry.value.size() >> 8);
  packed_.insert(packed_.end(), entry.value.begin(), entry.value.end());
}

template <class Visit>
void ExifEntries::visitEntries(Visit visit) const {
  ByteCursor cursor(packed_);
  while (cursor.remaining() >= kHeaderBytes) {
    Entry entry{};
    entry.group = ExifGroup{cursor.u8()};
    entry.type = TiffType{cursor.u8()};
    entry.tag = cursor.u16();
    entry.value = cursor.take(cursor.u16());
    if (!cursor.ok() || unitOf(entry.type) == 0) return;
    if (visit(entry)) return;
  }
}

bool ExifEntries::has(ExifGroup group) const {
  bool found = false;
  visitEntries([&](const Entry& entry) { return found = entry.group == group; });
  return found;
}

std::optional<Value> ExifEntries::find(ExifGroup group, std::string_view name) const {
  std::optional<Value> found;
  const auto tag = tagOf(group, name);
  if (!tag) return found;
  visitEntries([&](const Entry& entry) {
    if (entry.group != group || entry.tag != *tag) return false;
    found = valueOf(entry.type, entry.value);
    return true;
  });
  return found;
}

Dictionary ExifEntries::dictionary(ExifGroup group) const {
  Dictionary dictionary;
  visitEntries([&](const Entry& entry) {
    if (entry.group != group) return false;
    const std::string name = nameOf(group, entry.tag);
    if (!name.empty() && !dictionary.contains(name)) dictionary.set(name, valueOf(entry.type, entry.value));
    return false;
  });
  return dictionary;
}

ExifEntries ExifEntries::selected(bool (*keep)(ExifGroup group, std::uint16_t tag)) const {
  ExifEntries kept;
  kept.packed_.reserve(packed_.size());
  visitEntries([&](const Entry& entry) {
    if (keep(entry.group, entry.tag)) kept.append(entry);
    return false;
  });
  return kept;
}

}  // namespace brivo::images
