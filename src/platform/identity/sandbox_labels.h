// SPDX-License-Identifier: MIT
// What sandboxes say of the process inside. Pure and *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace brivo {

/// The application id in a /.flatpak-info file (flatpak-metadata(5)): "name" of the group "Application". None
/// when that is nothing that an application may be called.
std::optional<std::string> applicationInFlatpakInfo(std::string_view text);

/// The snap in an AppArmor label such as "snap.camera-app.import (enforce)".
std::optional<std::string> snapInSecurityLabel(std::string_view label);

}  // namespace brivo
