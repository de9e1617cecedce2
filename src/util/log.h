// SPDX-License-Identifier: MIT
// The one log object of the process and the form of its lines: a tag of at most 20 characters and a
// message. docs/logging.md says what belongs to which level.
#pragma once

#include <fmt/core.h>

#include <atomic>
#include <string>
#include <string_view>

#include "platform/logging/unified_log.h"

namespace brivo {

/// The subsystem under which the log object is made. Change it before the first line is logged, if
/// at all.
extern std::string OVLoggingDomain;
/// The verbose classes that are on, as a bit mask. *Thread-safe.*
extern std::atomic<unsigned> OVLoggingLevel;
/// The log object; null before __OVOSLogCreate().
extern const UnifiedLog* _gOVOSLog;

/// The verbose classes that sites in this system are gated by.
constexpr unsigned kLogTypeContent = 2;
constexpr unsigned kLogTypeDetail = 4;

/// Makes the log object, once for the life of the process. Every logging site calls it first.
/// *Thread-safe.*
void __OVOSLogCreate();
/// The bits of `mask` that are on; 0 means the class is off. *Thread-safe.*
unsigned __OVLogTypeEnabled(unsigned mask);

/// Writes "tag | message" (error level: "tag ! message") with the tag right-aligned in 20 columns.
/// A tag of 21 characters or more is cut to its first 18 and "..". *Thread-safe.*
void OVWriteLogLine(LogLevel level, std::string_view tag, std::string_view message);

/// A line at the default level. *Thread-safe*, as are all of these.
template <class... Arguments>
void OVLog(std::string_view tag, fmt::format_string<Arguments...> format, Arguments&&... arguments) {
  OVWriteLogLine(LogLevel::standard, tag, fmt::format(format, std::forward<Arguments>(arguments)...));
}

/// A line at the error level.
template <class... Arguments>
void OVLogError(std::string_view tag, fmt::format_string<Arguments...> format, Arguments&&... arguments) {
  OVWriteLogLine(LogLevel::error, tag, fmt::format(format, std::forward<Arguments>(arguments)...));
}

/// A line at the default level while the verbose class `mask` is on; nothing, not even formatting,
/// else.
template <class... Arguments>
void OVLogVerbose(unsigned mask, std::string_view tag, fmt::format_string<Arguments...> format,
                  Arguments&&... arguments) {
  if (__OVLogTypeEnabled(mask)) OVLog(tag, format, std::forward<Arguments>(arguments)...);
}

/// A line at the default level while the verbose class `mask` is on, at the debug level else.
template <class... Arguments>
void OVLogVerboseOrDebug(unsigned mask, std::string_view tag, fmt::format_string<Arguments...> format,
                         Arguments&&... arguments) {
  __OVOSLogCreate();
  const LogLevel level = __OVLogTypeEnabled(mask) ? LogLevel::standard : LogLevel::debug;
  if (!_gOVOSLog->enabled(level)) return;
  OVWriteLogLine(level, tag, fmt::format(format, std::forward<Arguments>(arguments)...));
}

}  // namespace brivo
