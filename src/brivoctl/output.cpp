// SPDX-License-Identifier: MIT
#include "brivoctl/output.h"

#include <fmt/core.h>

#include <array>
#include <cstdio>
#include <ctime>

#include "platform/text/unicode.h"

namespace brivoctl {

Json jsonOf(const orvid::DeviceInfo& device) {
  return {{"handle", device.uuid}, {"name", device.name}, {"path", device.mountPath}};
}

Json jsonOf(const orvid::ObjectInfo& object) {
  return {{"handle", object.handle},
          {"parent", object.parent},
          {"path", object.path},
          {"folder", object.isFolder},
          {"size", object.size},
          {"width", object.width},
          {"height", object.height},
          {"orientation", object.orientation},
          {"captured", object.captured},
          {"modified", object.modified},
          {"thumbOffset", object.thumbOffset},
          {"thumbSize", object.thumbSize},
          {"thumbWidth", object.thumbWidth},
          {"thumbHeight", object.thumbHeight},
          {"protected", object.isProtected}};
}

void printLine(const std::string& line) { std::fputs((line + "\n").c_str(), stdout); }

bool outputFailed() { return std::fflush(stdout) != 0 || std::ferror(stdout) != 0; }

void printJson(const Json& document) {
  printLine(document.dump(2, ' ', false, Json::error_handler_t::replace));
}

void printJsonLine(const Json& line) {
  printLine(line.dump(-1, ' ', false, Json::error_handler_t::replace));
  std::fflush(stdout);  // who reads JSON lines wants each when it comes
}

bool isFileName(const std::string& name) {
  return !name.empty() && name.find('/') == std::string::npos && !name.starts_with('.');
}

std::string shown(const std::string& text) { return brivo::escapingControls(text); }

std::string shownSize(std::uint64_t bytes) {
  constexpr std::array<const char*, 5> units{"B", "kB", "MB", "GB", "TB"};
  auto value = static_cast<double>(bytes);
  std::size_t unit = 0;
  for (; value >= 999.95 && unit + 1 < units.size(); ++unit) value /= 1000;
  return unit == 0 ? fmt::format("{} B", bytes) : fmt::format("{:.1f} {}", value, units[unit]);
}

std::string shownTime(std::uint64_t seconds) {
  const auto time = static_cast<std::time_t>(seconds);
  std::tm local{};
  char text[32];
  if (!::localtime_r(&time, &local) || std::strftime(text, sizeof text, "%Y-%m-%d %H:%M", &local) == 0)
    return "-";
  return text;
}

}  // namespace brivoctl
