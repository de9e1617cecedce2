// SPDX-License-Identifier: MIT
// The system calls on references to processes (pidfd_open(2)), which C++ cannot take from every C library.
#pragma once

#include "platform/base/unique_fd.h"

namespace brivo {

/// A reference to a child that is not reaped yet. None on failure; errno tells why.
UniqueFd referenceToChild(int process);
/// No effect on a process that has ended.
void killReferenced(const UniqueFd& process);

}  // namespace brivo
