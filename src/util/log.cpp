// SPDX-License-Identifier: MIT
#include "util/log.h"

#include <fmt/format.h>

#include <mutex>

#include "platform/text/unicode.h"

namespace brivo {

std::string OVLoggingDomain = "org.orvid.imagecapture";
std::atomic<unsigned> OVLoggingLevel = 0;
const UnifiedLog* _gOVOSLog = nullptr;

void __OVOSLogCreate() {
  static std::once_flag once;
  // Never released: other threads may log until the process is gone.
  std::call_once(once, [] { _gOVOSLog = new UnifiedLog(OVLoggingDomain, processName()); });
}

unsigned __OVLogTypeEnabled(unsigned mask) { return OVLoggingLevel.load(std::memory_order_relaxed) & mask; }

namespace {

constexpr std::size_t kLongestTag = 20;
constexpr std::size_t kKeptOfLongTag = 18;

std::string shortened(std::string_view tag) {
  if (codePointCount(tag) <= kLongestTag) return std::string(tag);
  return std::string(codePointPrefix(tag, kKeptOfLongTag)) + "..";
}

}  // namespace

void OVWriteLogLine(LogLevel level, std::string_view tag, std::string_view message) {
  __OVOSLogCreate();
  if (!_gOVOSLog->enabled(level)) return;
  if (message.ends_with('\n')) message.remove_suffix(1);  // the line ends itself
  const char bar = level == LogLevel::error ? '!' : '|';
  _gOVOSLog->write(level, fmt::format("{:>20} {} {}", shortened(tag), bar, message));
}

}  // namespace brivo
