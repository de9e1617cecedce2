// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <vector>

namespace brivo::test {

/// The children of a process, those that have ended and wait to be reaped among them.
std::vector<pid_t> childrenOf(pid_t process);
/// False for one that has ended, whether or not it is reaped.
bool isRunning(pid_t process);
/// True for a thread of this process that waits for something.
bool isBlocked(pid_t thread);

}  // namespace brivo::test
