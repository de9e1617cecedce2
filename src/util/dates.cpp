// SPDX-License-Identifier: MIT
#include "util/dates.h"

#include <fmt/core.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <cstddef>
#include <ctime>
#include <span>

namespace brivo {

namespace {

/// The number formats that these patterns use know no locale. Daylight saving time stays "not in effect".
std::optional<std::int64_t> localDate(const std::string& text, const char* pattern) {
  std::tm calendar{};
  (void)::strptime(text.c_str(), pattern, &calendar);
  calendar.tm_isdst = 0;
  errno = 0;
  const std::time_t seconds = std::mktime(&calendar);
  if (seconds == -1 && errno != 0) return std::nullopt;
  return seconds;
}

/// Reads a number of at most `width` characters as scanf(3) does, and takes it off the text; none, with the
/// text left alone, when there is none.
std::optional<int> takeNumber(std::string_view& text, std::size_t width) {
  const std::size_t start = text.find_first_not_of(" \t\n\v\f\r");
  if (start == std::string_view::npos) return std::nullopt;
  std::string_view field = text.substr(start, width);
  if (field.starts_with('+')) field.remove_prefix(1);
  int number = 0;
  const auto [end, error] = std::from_chars(field.data(), field.data() + field.size(), number);
  if (error != std::errc()) return std::nullopt;
  text.remove_prefix(static_cast<std::size_t>(end - text.data()));
  return number;
}

/// Reads as many of the fields as there are.
void readFields(std::string_view text, std::span<int> fields) {
  constexpr std::size_t kTimeFields = 3;  // behind the "T"
  for (std::size_t i = 0; i < fields.size(); ++i) {
    if (i == kTimeFields) {
      if (!text.starts_with('T')) return;
      text.remove_prefix(1);
    }
    const auto number = takeNumber(text, i == 0 ? 4 : 2);
    if (!number) return;
    fields[i] = *number;
  }
}

}  // namespace

std::optional<std::int64_t> OVStandardDateFromString(const std::string& text) {
  return localDate(text, "%Y:%m:%d %H:%M:%S");
}

std::string OVStandardStringFromDate(double secondsSince1970) {
  const auto seconds = static_cast<std::time_t>(secondsSince1970);
  std::tm calendar{};
  std::array<char, 20> text{};
  if (!::gmtime_r(&seconds, &calendar)) return {};
  // No conversion in it: the pattern is the text.
  return {text.data(), std::strftime(text.data(), text.size(), "yyyy:MM:dd HH:mm:ss", &calendar)};
}

std::optional<std::int64_t> OVStandardDateFromPTPString(const std::optional<std::string>& text) {
  return text ? localDate(*text, "%Y%m%dT%H%M%S.0") : std::nullopt;
}

std::string OVEXIFDateStringFromPTPDateString(const std::optional<std::string>& text) {
  constexpr std::size_t kShortest = 15;
  std::array<int, 6> fields{};
  if (text && text->size() >= kShortest) readFields(*text, fields);
  const auto [year, month, day, hour, minute, second] = fields;
  return fmt::format("{:04}:{:02}:{:02} {:02}:{:02}:{:02}", year, month, day, hour, minute, second);
}

}  // namespace brivo
