// SPDX-License-Identifier: MIT
#include "platform/images/x3f_properties.h"

#include <algorithm>
#include <charconv>
#include <string>

#include "platform/base/byte_cursor.h"
#include "platform/images/stated_facts.h"

namespace brivo::images {

namespace {

constexpr std::uint64_t kMostBytes = 32'768;
constexpr std::size_t kHeader = 24;
constexpr std::size_t kEntryBytes = 8;
constexpr std::size_t kLongestText = 64;

/// The characters of the list. Values that are kept are plain ASCII.
std::string textAt(std::span<const std::byte> characters, std::uint64_t index) {
  std::string text;
  if (index >= characters.size() / 2) return text;
  ByteCursor cursor(characters.subspan(static_cast<std::size_t>(index) * 2));
  while (text.size() < kLongestText && cursor.remaining() >= 2) {
    const std::uint16_t character = cursor.u16();
    if (character == 0) break;
    text += character < 0x80 ? static_cast<char>(character) : '?';
  }
  return text;
}

void readProperty(Parse& parse, const std::string& name, const std::string& value) {
  if (name == "CAMMANUF") keepMake(parse, value);
  if (name == "CAMMODEL") keepModel(parse, value);
  if (name != "TIME") return;
  std::uint32_t seconds = 0;
  std::from_chars(value.data(), value.data() + value.size(), seconds);
  keepCaptureTime(parse, seconds);
}

}  // namespace

/// "SECp", a version, the number of entries, a character format, a reserved number and the number of
/// characters come first. An entry says where in the characters its name and its value begin.
void readX3fProperties(Parse& parse, std::uint64_t start, std::uint64_t length) {
  const auto bytes = parse.ranges.upTo(start, static_cast<std::size_t>(std::min(length, kMostBytes)));
  ByteCursor cursor(bytes);
  cursor.skip(8);
  const std::uint64_t stated = cursor.u32();
  const bool isUtf16 = cursor.u32() == 0;
  if (!cursor.ok() || !isUtf16 || bytes.size() < kHeader) return;
  cursor.seek(kHeader);
  const std::size_t count =
      parse.spendEntries(std::min<std::uint64_t>(stated, cursor.remaining() / kEntryBytes));
  const auto characters = bytes.subspan(kHeader + count * kEntryBytes);
  for (std::size_t i = 0; i < count; ++i) {
    const std::string name = textAt(characters, cursor.u32());
    readProperty(parse, name, textAt(characters, cursor.u32()));
  }
}

}  // namespace brivo::images
