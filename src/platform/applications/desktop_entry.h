// SPDX-License-Identifier: MIT
// Desktop files (Desktop Entry Specification 1.5). Pure and *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace brivo {

/// What this system reads of a desktop file.
struct DesktopEntry {
  /// The first word of "Exec", unquoted: a path or a name to be looked up.
  std::string program;
};

/// None unless the text describes an application that is not marked as deleted and has a program.
std::optional<DesktopEntry> parseDesktopEntry(std::string_view text);

}  // namespace brivo
