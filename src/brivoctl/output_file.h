// SPDX-License-Identifier: MIT
// Files that commands make of what they were told.
#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>

namespace brivoctl {

/// Why no file can be made at `path`, as far as a look tells: worth knowing before long work.
std::optional<std::string> outputObstacle(const std::string& path);

/// Makes the file, or replaces it, in one step when all bytes are on disk. None, or what went wrong; then
/// nothing has changed.
[[nodiscard]] std::optional<std::string> writeOutput(const std::string& path,
                                                     std::span<const std::byte> bytes);

}  // namespace brivoctl
