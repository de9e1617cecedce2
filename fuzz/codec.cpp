// SPDX-License-Identifier: MIT
#include "ptp/codec.h"

#include <cstring>

#include "check.h"

namespace {

using brivo::PTPReadCursor;
using brivo::PTPWriteCursor;

/// The input with zeros behind it, as far as the readers that do not look at the end can get: they read up to
/// 1 + 2 * 255 bytes of a string, or the terminator of one.
std::vector<std::uint8_t> withRoom(const std::uint8_t* data, std::size_t size) {
  std::vector<std::uint8_t> bytes(size + 1024);
  if (size > 0) std::memcpy(bytes.data(), data, size);
  return bytes;
}

template <class Value, class Reader>
void checkInteger(PTPReadCursor start, PTPReadCursor limit, std::ptrdiff_t width, Reader read,
                  void (*write)(PTPWriteCursor&, Value)) {
  PTPReadCursor cursor = start;
  const Value value = read(cursor, limit);
  const bool fits = limit - start >= width;
  check(cursor - start == (fits ? width : 0));
  if (!fits) return check(value == 0);
  std::uint8_t written[8];
  PTPWriteCursor out = written;
  write(out, value);
  check(out - written == width && std::memcmp(written, start, static_cast<std::size_t>(width)) == 0);
}

void checkIntegers(PTPReadCursor start, PTPReadCursor limit) {
  checkInteger(start, limit, 2, brivo::ReadSInt16MaxSize, brivo::WriteSInt16);
  checkInteger(start, limit, 2, brivo::ReadUInt16MaxSize, brivo::WriteUInt16);
  checkInteger(start, limit, 4, brivo::ReadSInt32MaxSize, brivo::WriteSInt32);
  checkInteger(start, limit, 4, brivo::ReadUInt32MaxSize, brivo::WriteUInt32);
  checkInteger(start, limit, 8, brivo::ReadSInt64MaxSize, brivo::WriteSInt64);
  checkInteger(start, limit, 8, brivo::ReadUInt64MaxSize, brivo::WriteUInt64);
}

void checkCountedString(PTPReadCursor start, PTPReadCursor limit) {
  PTPReadCursor cursor = start;
  const auto string = brivo::CopyUnicodeStringWithLengthByteFromBufferMaxSize(cursor, limit);
  check(string.has_value() == (limit - start >= *start));
  if (!string) return check(cursor == start);
  check(cursor - start == (*start == 0 ? 1 : 1 + 2 * *start));
  std::uint8_t written[1 + 2 * 255];
  PTPWriteCursor out = written;
  brivo::WriteUnicodeStringWithLengthByteToBuffer(out, *string);
  PTPReadCursor again = written;
  check(brivo::CopyUnicodeStringWithLengthByteFromBuffer(again) == *string && again == out);
}

void checkTerminatedString(PTPReadCursor start) {
  PTPReadCursor cursor = start;
  const std::u16string string = brivo::CopyUnicodeStringFromBuffer(cursor);
  check(cursor - start == static_cast<std::ptrdiff_t>(2 * (string.size() + 1)));
  std::vector<std::uint8_t> written(2 * (string.size() + 1));
  PTPWriteCursor out = written.data();
  brivo::WriteUnicodeStringToBuffer(out, string);
  check(std::memcmp(written.data(), start, written.size()) == 0);
}

/// The size of an array is computed in 32 bits, so only counts whose products do not wrap are for the checked
/// readers to judge.
template <class Element, class Reader, class Writer>
void checkArray(PTPReadCursor start, PTPReadCursor limit, Reader read, Writer write) {
  PTPReadCursor cursor = start;
  const std::uint64_t count = brivo::ReadUInt32(cursor);
  const std::uint64_t size = 4 + count * sizeof(Element);
  if (size > 0xFFFFFFFF) return;
  cursor = start;
  const auto array = read(cursor, limit);
  check(array.has_value() == (static_cast<std::uint64_t>(limit - start) >= size));
  if (!array) return check(cursor == start);
  check(array->size() == count);
  std::vector<std::uint8_t> written(size);
  PTPWriteCursor out = written.data();
  write(out, *array);
  check(std::memcmp(written.data(), start, size) == 0);
}

}  // namespace

// The checked readers read what is inside the limit and nothing else, and what is read is written as it was.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto bytes = withRoom(data, size);
  PTPReadCursor start = bytes.data();
  PTPReadCursor limit = start + size;
  checkIntegers(start, limit);
  checkCountedString(start, limit);
  checkTerminatedString(start);
  checkArray<std::uint16_t>(start, limit, brivo::CopyArrayOfUnsignedShortsFromBufferMaxSize,
                            brivo::WriteArrayOfUnsignedShortsToBuffer);
  checkArray<std::uint32_t>(start, limit, brivo::CopyArrayOfHandlesFromBufferMaxSize,
                            brivo::WriteArrayOfHandlesToBuffer);
  return 0;
}
