// SPDX-License-Identifier: MIT
// Camera dates: texts of EXIF (CIPA DC-008) and PTP (ISO 15740) and seconds since 1970. A text is read
// leniently: what follows the first mistake counts as zeros, and no text is refused. *Thread-safe.*
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace brivo {

/// Seconds since 1970 of an EXIF date, "year:month:day hour:minute:second", as local time without daylight
/// saving time. None when the calendar has no such time.
std::optional<std::int64_t> OVStandardDateFromString(const std::string& text);

/// The pattern of an EXIF date: this function has always given the pattern itself, for whatever date.
std::string OVStandardStringFromDate(double secondsSince1970);

/// Seconds since 1970 of a PTP date, "yyyymmddThhmmss.0", as local time without daylight saving time; none
/// for none.
std::optional<std::int64_t> OVStandardDateFromPTPString(const std::optional<std::string>& text);

/// A PTP date in the form of EXIF; zeros for a text of fewer than 15 bytes, and in the fields that cannot be
/// read.
std::string OVEXIFDateStringFromPTPDateString(const std::optional<std::string>& text);

}  // namespace brivo
