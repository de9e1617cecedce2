// SPDX-License-Identifier: MIT
#include "platform/logging/standard_error.h"

#include <unistd.h>

#include <cerrno>
#include <cstddef>

namespace brivo {

void writeToStandardError(std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = ::write(STDERR_FILENO, text.data(), text.size());
    if (written < 0 && errno != EINTR) return;
    if (written > 0) text.remove_prefix(static_cast<std::size_t>(written));
  }
}

}  // namespace brivo
