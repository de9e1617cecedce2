// SPDX-License-Identifier: MIT
#include "platform/identity/sandbox_labels.h"

#include <algorithm>

namespace brivo {

namespace {

constexpr std::size_t kLongestApplicationId = 255;

std::string_view nextLine(std::string_view& text) {
  const auto end = text.find('\n');
  const std::string_view line = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  return line;
}

bool isLetterOrDigit(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

/// Words with dots between them, as in the names of D-Bus: never a path, and nothing that upsets a terminal.
bool isApplicationId(std::string_view id) {
  const auto isAllowed = [](char c) { return isLetterOrDigit(c) || c == '_' || c == '-' || c == '.'; };
  return id.size() <= kLongestApplicationId && id.find('.') != std::string_view::npos &&
         !id.starts_with('.') && !id.ends_with('.') && id.find("..") == std::string_view::npos &&
         std::ranges::all_of(id, isAllowed);
}

}  // namespace

std::optional<std::string> applicationInFlatpakInfo(std::string_view text) {
  bool inApplication = false;
  while (!text.empty()) {
    std::string_view line = nextLine(text);
    if (line.starts_with('[')) {
      inApplication = line == "[Application]";
    } else if (inApplication && line.starts_with("name=")) {
      line.remove_prefix(5);
      return isApplicationId(line) ? std::optional<std::string>(line) : std::nullopt;
    }
  }
  return std::nullopt;
}

std::optional<std::string> snapInSecurityLabel(std::string_view label) {
  constexpr std::string_view prefix = "snap.";
  if (!label.starts_with(prefix)) return std::nullopt;
  label.remove_prefix(prefix.size());
  const auto dot = label.find('.');
  if (dot == std::string_view::npos || dot == 0) return std::nullopt;
  return std::string(label.substr(0, dot));
}

}  // namespace brivo
