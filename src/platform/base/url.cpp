// SPDX-License-Identifier: MIT
#include "platform/base/url.h"

#include <array>
#include <charconv>

namespace brivo {

namespace {

bool isPathCharacter(char c) {
  const bool alphanumeric = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
  return alphanumeric || std::string_view("-._~!$&'()*+,;=:@/").find(c) != std::string_view::npos;
}

std::string percentDecoded(std::string_view text) {
  std::string decoded;
  decoded.reserve(text.size());
  for (std::size_t i = 0; i < text.size(); ++i) {
    unsigned byte = 0;
    const auto hex = text.substr(i, 3);
    if (hex.size() == 3 && hex[0] == '%' &&
        std::from_chars(hex.data() + 1, hex.data() + 3, byte, 16).ptr == hex.data() + 3) {
      decoded += static_cast<char>(byte);
      i += 2;
    } else {
      decoded += text[i];
    }
  }
  return decoded;
}

}  // namespace

Url Url::file(std::string_view path) {
  constexpr std::string_view digits = "0123456789ABCDEF";
  std::string text = "file://";
  for (const char c : path) {
    if (isPathCharacter(c)) {
      text += c;
    } else {
      const auto byte = static_cast<unsigned char>(c);
      text += {'%', digits[byte >> 4], digits[byte & 0x0F]};
    }
  }
  return Url(std::move(text));
}

std::string Url::path() const {
  if (!isFile()) return {};
  std::string_view rest = std::string_view(text_).substr(5);
  if (rest.starts_with("//")) {  // skip the host
    const auto slash = rest.find('/', 2);
    rest = slash == std::string_view::npos ? std::string_view() : rest.substr(slash);
  }
  std::string path = percentDecoded(rest);
  while (path.size() > 1 && path.back() == '/') path.pop_back();
  return path;
}

}  // namespace brivo
