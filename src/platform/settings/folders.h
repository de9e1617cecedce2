// SPDX-License-Identifier: MIT
#pragma once

#include <optional>
#include <string>

#include "platform/base/result.h"

namespace brivo {

/// Makes `path` for this user alone when it is missing, but not the folders above it. None on success.
[[nodiscard]] std::optional<SystemError> makePrivateFolder(const std::string& path);

/// Makes one of the user's base directories with those above it, as the XDG Base Directory Specification
/// wants it done by whoever first writes there. None on success.
[[nodiscard]] std::optional<SystemError> makeBaseDirectory(const std::string& path);

}  // namespace brivo
