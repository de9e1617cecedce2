// SPDX-License-Identifier: MIT
// What sandboxes say of the process inside. Pure and *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace brivo {

/// The application id in a /.flatpak-info file (flatpak-metadata(5)): "name" of the group "Application".
std::optional<std::string> applicationInFlatpakInfo(std::string_view text);

/// The snap in an AppArmor label such as "snap.camera-app.import (enforce)".
std::optional<std::string> snapInSecurityLabel(std::string_view label);

/// The process that a pidfd stands for, from its entry in /proc/self/fdinfo (proc_pid_fdinfo(5)). None for a
/// process that has ended or belongs to a process namespace that we cannot see into.
std::optional<int> processInFdinfo(std::string_view text);

}  // namespace brivo
