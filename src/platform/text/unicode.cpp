// SPDX-License-Identifier: MIT
#include "platform/text/unicode.h"

#include <fmt/format.h>
#include <unicase.h>
#include <unistr.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>

namespace brivo {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";

const std::uint8_t* units(std::string_view text) {
  return reinterpret_cast<const std::uint8_t*>(text.data());
}

/// The next code point and its length in bytes; an ill-formed sequence is one byte long and has no
/// value.
struct CodePoint {
  std::optional<char32_t> value;
  std::size_t length = 1;
};

CodePoint codePointAt(std::string_view text, std::size_t position) {
  const std::string_view rest = text.substr(position);
  ucs4_t value = 0;
  const int length = u8_mbtoucr(&value, units(rest), rest.size());
  if (length <= 0) return {};
  return {value, static_cast<std::size_t>(length)};
}

bool isAscii(std::string_view text) {
  return std::ranges::all_of(text, [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

bool isControl(char32_t c) { return c < 0x20 || (c >= 0x7F && c < 0xA0) || c == 0x2028 || c == 0x2029; }

bool isNoncharacter(char32_t c) { return (c >= 0xFDD0 && c <= 0xFDEF) || (c & 0xFFFE) == 0xFFFE; }

/// None is before U+FDD0, whose first byte is this.
bool mayHoldNoncharacter(std::string_view utf8) {
  return std::ranges::any_of(utf8, [](char c) { return static_cast<unsigned char>(c) >= 0xEF; });
}

template <class IsGood>
std::string replacingAllBut(std::string_view bytes, IsGood isGood) {
  std::string text;
  for (std::size_t i = 0; i < bytes.size();) {
    const CodePoint next = codePointAt(bytes, i);
    text += next.value && isGood(*next.value) ? bytes.substr(i, next.length) : kReplacement;
    i += next.length;
  }
  return text;
}

}  // namespace

bool isUtf8(std::string_view text) { return u8_check(units(text), text.size()) == nullptr; }

std::string replacingInvalidUtf8(std::string_view bytes) {
  if (isUtf8(bytes)) return std::string(bytes);
  return replacingAllBut(bytes, [](char32_t) { return true; });
}

std::string replacingNoncharacters(std::string_view bytes) {
  if (isUtf8(bytes) && !mayHoldNoncharacter(bytes)) return std::string(bytes);
  return replacingAllBut(bytes, [](char32_t c) { return !isNoncharacter(c); });
}

std::u16string toUtf16(std::string_view utf8) {
  std::u16string utf16;
  utf16.reserve(utf8.size());
  for (std::size_t i = 0; i < utf8.size();) {
    const CodePoint next = codePointAt(utf8, i);
    const char32_t c = next.value.value_or(0xFFFD);
    if (c < 0x10000) {
      utf16 += static_cast<char16_t>(c);
    } else {
      utf16 += static_cast<char16_t>(0xD800 + ((c - 0x10000) >> 10));
      utf16 += static_cast<char16_t>(0xDC00 + ((c - 0x10000) & 0x3FF));
    }
    i += next.length;
  }
  return utf16;
}

std::string toUtf8(std::u16string_view utf16) {
  std::string utf8;
  utf8.reserve(utf16.size());
  for (std::size_t i = 0; i < utf16.size();) {
    ucs4_t value = 0;
    const auto* rest = reinterpret_cast<const std::uint16_t*>(utf16.data()) + i;
    const int length = u16_mbtoucr(&value, rest, utf16.size() - i);
    std::uint8_t encoded[6];
    const int count = length > 0 ? u8_uctomb(encoded, value, sizeof encoded) : -1;
    if (count > 0) {
      utf8.append(reinterpret_cast<const char*>(encoded), static_cast<std::size_t>(count));
    } else {
      utf8 += kReplacement;
    }
    i += length > 0 ? static_cast<std::size_t>(length) : 1;
  }
  return utf8;
}

std::optional<std::string> upperCased(std::string_view text) {
  if (isAscii(text)) {  // nearly every name on a card
    std::string upper(text);
    for (char& c : upper) {
      if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
    }
    return upper;
  }
  if (!isUtf8(text)) return std::nullopt;
  std::size_t length = 0;
  const std::unique_ptr<std::uint8_t, decltype(&std::free)> upper(
      u8_toupper(units(text), text.size(), nullptr, nullptr, nullptr, &length), &std::free);
  if (!upper) return std::nullopt;
  return std::string(reinterpret_cast<const char*>(upper.get()), length);
}

std::string asciiLowerCased(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) {
    if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
  }
  return lower;
}

std::string escapingControls(std::string_view text) {
  const auto isPlain = [](char c) { return c >= 0x20 && c < 0x7F; };
  std::string line;
  line.reserve(text.size());
  for (std::size_t i = 0; i < text.size();) {
    const auto rest = text.substr(i);
    const auto plain = static_cast<std::size_t>(std::ranges::find_if_not(rest, isPlain) - rest.begin());
    line += rest.substr(0, plain);
    i += plain;
    if (i == text.size()) break;
    const CodePoint next = codePointAt(text, i);
    if (!next.value) {
      line += kReplacement;
    } else if (*next.value < 0x100 && isControl(*next.value)) {
      line += fmt::format("\\x{:02x}", static_cast<std::uint32_t>(*next.value));
    } else if (isControl(*next.value)) {
      line += fmt::format("\\u{{{:04x}}}", static_cast<std::uint32_t>(*next.value));
    } else {
      line += text.substr(i, next.length);
    }
    i += next.length;
  }
  return line;
}

std::size_t codePointCount(std::string_view text) {
  std::size_t count = 0;
  for (std::size_t i = 0; i < text.size(); ++count) i += codePointAt(text, i).length;
  return count;
}

std::string_view codePointPrefix(std::string_view text, std::size_t count) {
  std::size_t end = 0;
  while (count-- > 0 && end < text.size()) end += codePointAt(text, end).length;
  return text.substr(0, end);
}

}  // namespace brivo
