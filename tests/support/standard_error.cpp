// SPDX-License-Identifier: MIT
#include "support/standard_error.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

namespace brivo::test {

StandardErrorCapture::StandardErrorCapture()
    : saved_(::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3)),
      file_(::memfd_create("standard-error", MFD_CLOEXEC)) {
  ::fcntl(file_, F_SETFL, O_APPEND);
  ::dup2(file_, STDERR_FILENO);
}

StandardErrorCapture::~StandardErrorCapture() {
  ::dup2(saved_, STDERR_FILENO);
  ::close(saved_);
  ::close(file_);
}

std::string StandardErrorCapture::text() const {
  std::string text;
  char buffer[4096];
  ssize_t count = 0;
  while ((count = ::pread(file_, buffer, sizeof buffer, static_cast<off_t>(text.size()))) > 0) {
    text.append(buffer, static_cast<std::size_t>(count));
  }
  return text;
}

}  // namespace brivo::test
