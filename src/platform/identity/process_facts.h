// SPDX-License-Identifier: MIT
// What the files in /proc say of a process (proc(5)). Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

namespace brivo {

/// The process that a pidfd stands for, from its entry in /proc/self/fdinfo. None for a process that has
/// ended or belongs to a process namespace that we cannot see into.
std::optional<std::int32_t> processInFdinfo(std::string_view text);

/// When a process was started, in clock ticks since the system was, from its "stat". None for one that has
/// ended.
std::optional<std::uint64_t> startTimeInStat(std::string_view text);

}  // namespace brivo
