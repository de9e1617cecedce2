// SPDX-License-Identifier: MIT
#include "platform/base/base64.h"

#include <cstdint>

namespace brivo {

namespace {

constexpr std::string_view kAlphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

}  // namespace

std::string encodeBase64(std::span<const std::byte> bytes) {
  std::string text;
  for (std::size_t i = 0; i < bytes.size(); i += 3) {
    const std::size_t count = std::min<std::size_t>(3, bytes.size() - i);
    std::uint32_t group = 0;
    for (std::size_t k = 0; k < 3; ++k) {
      group = group << 8 | (k < count ? std::to_integer<std::uint32_t>(bytes[i + k]) : 0);
    }
    for (std::size_t k = 0; k < 4; ++k) {
      text += k <= count ? kAlphabet[group >> (18 - 6 * k) & 0x3F] : '=';
    }
  }
  return text;
}

std::optional<std::vector<std::byte>> decodeBase64(std::string_view text) {
  std::vector<std::byte> bytes;
  std::uint32_t bits = 0;
  int count = 0;
  for (const char c : text) {
    if (c == ' ' || c == '\t' || c == '\n' || c == '\r') continue;
    if (c == '=') break;
    const auto digit = kAlphabet.find(c);
    if (digit == std::string_view::npos) return std::nullopt;
    bits = bits << 6 | static_cast<std::uint32_t>(digit);
    count += 6;
    if (count >= 8) {
      count -= 8;
      bytes.push_back(static_cast<std::byte>(bits >> count & 0xFF));
    }
  }
  return bytes;
}

}  // namespace brivo
