// SPDX-License-Identifier: MIT
#include "ptp/codec.h"

#include "util/log.h"

namespace brivo {

namespace {

template <class Unsigned>
Unsigned read(PTPReadCursor& cursor) {
  std::uint64_t value = 0;
  for (std::size_t i = 0; i < sizeof(Unsigned); ++i) {
    value |= std::uint64_t{cursor[i]} << (8 * i);
  }
  cursor += sizeof(Unsigned);
  return static_cast<Unsigned>(value);
}

template <class Unsigned>
Unsigned readUpTo(PTPReadCursor& cursor, PTPReadCursor limit) {
  const bool fits = limit - cursor >= static_cast<std::ptrdiff_t>(sizeof(Unsigned));
  return fits ? read<Unsigned>(cursor) : Unsigned{0};
}

template <class Unsigned>
void write(PTPWriteCursor& cursor, Unsigned value) {
  for (std::size_t i = 0; i < sizeof(Unsigned); ++i) {
    *cursor++ = static_cast<std::uint8_t>(std::uint64_t{value} >> (8 * i));
  }
}

std::u16string readUnits(PTPReadCursor& cursor, std::size_t count) {
  std::u16string units;
  for (std::size_t i = 0; i < count; ++i) units += static_cast<char16_t>(read<std::uint16_t>(cursor));
  return units;
}

void writeUnits(PTPWriteCursor& cursor, std::u16string_view units) {
  for (const char16_t unit : units) write<std::uint16_t>(cursor, unit);
}

template <class Element>
std::vector<Element> readArray(PTPReadCursor& cursor) {
  const auto count = read<std::uint32_t>(cursor);
  std::vector<Element> array;
  for (std::uint32_t i = 0; i < count; ++i) array.push_back(read<Element>(cursor));
  return array;
}

template <class Element>
std::optional<std::vector<Element>> readArrayUpTo(PTPReadCursor& cursor, PTPReadCursor limit) {
  PTPReadCursor start = cursor;
  const auto count = read<std::uint32_t>(start);
  const std::uint32_t size = count * static_cast<std::uint32_t>(sizeof(Element)) + 4;  // wraps
  if (limit - cursor < static_cast<std::ptrdiff_t>(size)) return std::nullopt;
  return readArray<Element>(cursor);
}

template <class Element>
void writeArray(PTPWriteCursor& cursor, const std::vector<Element>& array) {
  write(cursor, static_cast<std::uint32_t>(array.size()));
  for (const Element element : array) write(cursor, element);
}

}  // namespace

std::int32_t ReadSInt16(PTPReadCursor& cursor) {
  return static_cast<std::int16_t>(read<std::uint16_t>(cursor));
}
std::uint32_t ReadUInt16(PTPReadCursor& cursor) { return read<std::uint16_t>(cursor); }
std::int32_t ReadSInt32(PTPReadCursor& cursor) {
  return static_cast<std::int32_t>(read<std::uint32_t>(cursor));
}
std::uint32_t ReadUInt32(PTPReadCursor& cursor) { return read<std::uint32_t>(cursor); }
std::int64_t ReadSInt64(PTPReadCursor& cursor) {
  return static_cast<std::int64_t>(read<std::uint64_t>(cursor));
}
std::uint64_t ReadUInt64(PTPReadCursor& cursor) { return read<std::uint64_t>(cursor); }

std::int32_t ReadSInt16MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return static_cast<std::int16_t>(readUpTo<std::uint16_t>(cursor, limit));
}
std::uint32_t ReadUInt16MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return readUpTo<std::uint16_t>(cursor, limit);
}
std::int32_t ReadSInt32MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return static_cast<std::int32_t>(readUpTo<std::uint32_t>(cursor, limit));
}
std::uint32_t ReadUInt32MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return readUpTo<std::uint32_t>(cursor, limit);
}
std::int64_t ReadSInt64MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return static_cast<std::int64_t>(readUpTo<std::uint64_t>(cursor, limit));
}
std::uint64_t ReadUInt64MaxSize(PTPReadCursor& cursor, PTPReadCursor limit) {
  return readUpTo<std::uint64_t>(cursor, limit);
}

void WriteSInt16(PTPWriteCursor& cursor, std::int32_t value) {
  write(cursor, static_cast<std::uint16_t>(value));
}
void WriteUInt16(PTPWriteCursor& cursor, std::uint32_t value) {
  write(cursor, static_cast<std::uint16_t>(value));
}
void WriteSInt32(PTPWriteCursor& cursor, std::int32_t value) {
  write(cursor, static_cast<std::uint32_t>(value));
}
void WriteUInt32(PTPWriteCursor& cursor, std::uint32_t value) { write(cursor, value); }
void WriteSInt64(PTPWriteCursor& cursor, std::int64_t value) {
  write(cursor, static_cast<std::uint64_t>(value));
}
void WriteUInt64(PTPWriteCursor& cursor, std::uint64_t value) { write(cursor, value); }

std::u16string CopyUnicodeStringWithLengthByteFromBuffer(PTPReadCursor& cursor) {
  const std::uint8_t count = *cursor++;
  if (count == 0) return {};
  std::u16string string = readUnits(cursor, count - std::size_t{1});
  cursor += 2;
  return string;
}

std::optional<std::u16string> CopyUnicodeStringWithLengthByteFromBufferMaxSize(PTPReadCursor& cursor,
                                                                               PTPReadCursor limit) {
  if (limit - cursor < *cursor) return std::nullopt;
  return CopyUnicodeStringWithLengthByteFromBuffer(cursor);
}

void WriteUnicodeStringWithLengthByteToBuffer(PTPWriteCursor& cursor, std::u16string_view string) {
  if (string.empty()) {
    *cursor++ = 0;
    return;
  }
  *cursor++ = static_cast<std::uint8_t>(string.size() + 1);
  WriteUnicodeStringToBuffer(cursor, string);
}

std::u16string CopyUnicodeStringFromBuffer(PTPReadCursor& cursor) {
  std::u16string string;
  while (const auto unit = read<std::uint16_t>(cursor)) string += static_cast<char16_t>(unit);
  return string;
}

void WriteUnicodeStringToBuffer(PTPWriteCursor& cursor, std::u16string_view string) {
  writeUnits(cursor, string);
  write<std::uint16_t>(cursor, 0);
}

std::vector<std::uint16_t> CopyArrayOfUnsignedShortsFromBuffer(PTPReadCursor& cursor) {
  return readArray<std::uint16_t>(cursor);
}
std::optional<std::vector<std::uint16_t>> CopyArrayOfUnsignedShortsFromBufferMaxSize(PTPReadCursor& cursor,
                                                                                     PTPReadCursor limit) {
  return readArrayUpTo<std::uint16_t>(cursor, limit);
}
void WriteArrayOfUnsignedShortsToBuffer(PTPWriteCursor& cursor, const std::vector<std::uint16_t>& array) {
  writeArray(cursor, array);
}

std::vector<std::uint32_t> CopyArrayOfHandlesFromBuffer(PTPReadCursor& cursor) {
  return readArray<std::uint32_t>(cursor);
}
std::optional<std::vector<std::uint32_t>> CopyArrayOfHandlesFromBufferMaxSize(PTPReadCursor& cursor,
                                                                              PTPReadCursor limit) {
  auto handles = readArrayUpTo<std::uint32_t>(cursor, limit);
  if (!handles) {
    OVLogError("ptp", "The camera returned an invalid buffer for object handles; cannot enumerate it.");
  }
  return handles;
}
void WriteArrayOfHandlesToBuffer(PTPWriteCursor& cursor, const std::vector<std::uint32_t>& array) {
  writeArray(cursor, array);
}

}  // namespace brivo
