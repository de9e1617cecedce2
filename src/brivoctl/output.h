// SPDX-License-Identifier: MIT
// How things are shown, to people and as JSON.
#pragma once

#include <nlohmann/json.hpp>
#include <string>

#include "orvidcore/orvidcore.h"

namespace brivoctl {

using Json = nlohmann::ordered_json;

Json jsonOf(const orvid::DeviceInfo& device);
Json jsonOf(const orvid::ObjectInfo& object);

/// A line on standard output. Whether that worked is for outputFailed() to tell.
void printLine(const std::string& line);
/// Writes what standard output still holds; true when that or anything before failed.
bool outputFailed();

/// Prints one document, or one line of JSON lines. Bytes that are no UTF-8 become replacement characters.
void printJson(const Json& document);
void printJsonLine(const Json& line);

/// A name from a card can be given to a file here: it leads nowhere else and is not hidden.
bool isFileName(const std::string& name);
/// Text from a card, safe for a terminal: control characters are shown escaped.
std::string shown(const std::string& text);
/// Such as "24.1 MB".
std::string shownSize(std::uint64_t bytes);
/// Local date and time of seconds since 1970.
std::string shownTime(std::uint64_t seconds);

}  // namespace brivoctl
