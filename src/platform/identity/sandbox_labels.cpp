// SPDX-License-Identifier: MIT
#include "platform/identity/sandbox_labels.h"

#include <charconv>

namespace brivo {

namespace {

std::string_view nextLine(std::string_view& text) {
  const auto end = text.find('\n');
  const std::string_view line = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  return line;
}

}  // namespace

std::optional<std::string> applicationInFlatpakInfo(std::string_view text) {
  bool inApplication = false;
  while (!text.empty()) {
    const std::string_view line = nextLine(text);
    if (line.starts_with('[')) {
      inApplication = line == "[Application]";
    } else if (inApplication && line.starts_with("name=") && line.size() > 5) {
      return std::string(line.substr(5));
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

std::optional<int> processInFdinfo(std::string_view text) {
  while (!text.empty()) {
    std::string_view line = nextLine(text);
    if (!line.starts_with("Pid:")) continue;
    line.remove_prefix(4);
    line.remove_prefix(std::min(line.find_first_not_of(" \t"), line.size()));
    int pid = 0;
    std::from_chars(line.data(), line.data() + line.size(), pid);
    return pid > 0 ? std::optional<int>(pid) : std::nullopt;
  }
  return std::nullopt;
}

}  // namespace brivo
