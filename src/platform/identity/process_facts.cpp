// SPDX-License-Identifier: MIT
#include "platform/identity/process_facts.h"

#include <algorithm>
#include <charconv>

namespace brivo {

namespace {

constexpr int kStartTimeAfterState = 19;

/// The text up to `separator`, which is taken off as well.
std::string_view next(std::string_view& text, char separator) {
  const auto end = text.find(separator);
  const std::string_view part = text.substr(0, end);
  text = end == std::string_view::npos ? std::string_view() : text.substr(end + 1);
  return part;
}

template <class Number>
std::optional<Number> numberIn(std::string_view text) {
  Number number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
  return number;
}

}  // namespace

std::optional<std::int32_t> processInFdinfo(std::string_view text) {
  while (!text.empty()) {
    std::string_view line = next(text, '\n');
    if (!line.starts_with("Pid:")) continue;
    line.remove_prefix(4);
    line.remove_prefix(std::min(line.find_first_not_of(" \t"), line.size()));
    const auto pid = numberIn<std::int32_t>(line);
    return pid && *pid > 0 ? pid : std::nullopt;
  }
  return std::nullopt;
}

std::optional<std::uint64_t> startTimeInStat(std::string_view text) {
  const auto name = text.rfind(") ");  // the name before it may hold anything
  if (name == std::string_view::npos) return std::nullopt;
  text.remove_prefix(name + 2);
  const std::string_view state = next(text, ' ');
  if (state == "Z" || state == "X") return std::nullopt;
  for (int i = 1; i < kStartTimeAfterState; ++i) next(text, ' ');
  return numberIn<std::uint64_t>(next(text, ' '));
}

}  // namespace brivo
