// SPDX-License-Identifier: MIT
// The questions that the user is asked about an application, in the user's language.
#pragma once

#include <string>

#include "platform/base/value.h"

namespace brivoctl {

/// May it use the cameras? The default button lets it.
brivo::Dictionary accessAlert(const std::string& identifier);
/// May it control them?
brivo::Dictionary controlAlert(const std::string& identifier);

}  // namespace brivoctl
