// SPDX-License-Identifier: MIT
#include "platform/base/unique_fd.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

namespace brivo {

void UniqueFd::reset(int fd) {
  if (fd_ >= 0) {
    const int saved = errno;
    ::close(fd_);
    errno = saved;
  }
  fd_ = fd;
}

UniqueFd UniqueFd::duplicate() const { return UniqueFd(fd_ < 0 ? -1 : ::fcntl(fd_, F_DUPFD_CLOEXEC, 0)); }

}  // namespace brivo
