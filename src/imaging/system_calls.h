// SPDX-License-Identifier: MIT
#pragma once

#include <optional>

#include "platform/base/result.h"

namespace brivo::imaging {

/// Leaves to every thread of this process the system calls that decoding needs, for good (seccomp(2)). Those
/// that a library may try on its way to something else, above all to open a file, fail with EPERM; any other
/// ends the process. Needs PR_SET_NO_NEW_PRIVS. None on success.
std::optional<SystemError> restrictSystemCalls();

}  // namespace brivo::imaging
