// SPDX-License-Identifier: MIT
#include "platform/zeph/address.h"

#include <fmt/format.h>

#include <charconv>

namespace brivo::zeph {

namespace {

bool isPlain(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         std::string_view("-_/.\\*").find(c) != std::string_view::npos;
}

std::optional<std::string> unescaped(std::string_view text) {
  std::string plain;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      plain += text[i];
      continue;
    }
    unsigned byte = 0;
    const std::string_view hex = text.substr(i + 1, 2);
    const auto [end, error] = std::from_chars(hex.data(), hex.data() + hex.size(), byte, 16);
    if (hex.size() != 2 || error != std::errc() || end != hex.data() + 2) return std::nullopt;
    plain += static_cast<char>(byte);
    i += 2;
  }
  return plain;
}

/// Takes the part of `text` before `separator` off it.
std::string_view split(std::string_view& text, char separator) {
  const auto end = text.find(separator);
  const std::string_view part = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  return part;
}

}  // namespace

Endpoint endpointForPath(std::string_view path) {
  std::string address = "unix:path=";
  for (const char c : path) {
    if (isPlain(c)) {
      address += c;
    } else {
      address += fmt::format("%{:02x}", static_cast<unsigned char>(c));
    }
  }
  return {address};
}

std::optional<std::string> pathOfEndpoint(const Endpoint& endpoint) {
  std::string_view addresses = endpoint.address;
  while (!addresses.empty()) {
    std::string_view entry = split(addresses, ';');
    if (split(entry, ':') != "unix") continue;
    while (!entry.empty()) {
      std::string_view pair = split(entry, ',');
      if (split(pair, '=') == "path") return unescaped(pair);
    }
  }
  return std::nullopt;
}

}  // namespace brivo::zeph
