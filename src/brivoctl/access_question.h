// SPDX-License-Identifier: MIT
// access ask
#pragma once

#include <string>

#include "brivoctl/command.h"

namespace brivoctl {

/// Asks the user whether an application may use the cameras, unless there is a grant, and stores a yes.
ExitCode askForAccess(const CommonOptions& common, const std::string& identifier);
/// The same for controlling them; a grant is stored whatever the answer is.
ExitCode askForControl(const CommonOptions& common, const std::string& identifier);

}  // namespace brivoctl
