// SPDX-License-Identifier: MIT
#include "platform/process/process_setup.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

#include <csignal>

namespace brivo {

void prepareProcess() {
  // An open file must never get one of the standard numbers.
  for (int fd = ::open("/dev/null", O_RDWR); fd >= 0; fd = ::dup(fd)) {
    if (fd > STDERR_FILENO) {
      ::close(fd);
      break;
    }
  }
  std::signal(SIGPIPE, SIG_IGN);
  rlimit files{};
  if (::getrlimit(RLIMIT_NOFILE, &files) == 0) {
    files.rlim_cur = files.rlim_max;
    ::setrlimit(RLIMIT_NOFILE, &files);
  }
}

}  // namespace brivo
