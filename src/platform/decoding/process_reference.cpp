// SPDX-License-Identifier: MIT
#include "platform/decoding/process_reference.h"

#include <sys/syscall.h>
#include <unistd.h>

#include <csignal>

namespace brivo {

UniqueFd referenceToChild(int process) {
  return UniqueFd(static_cast<int>(::syscall(SYS_pidfd_open, process, 0)));
}

void killReferenced(const UniqueFd& process) {
  ::syscall(SYS_pidfd_send_signal, process.get(), SIGKILL, nullptr, 0);
}

}  // namespace brivo
