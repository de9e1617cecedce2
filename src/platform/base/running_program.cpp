// SPDX-License-Identifier: MIT
#include "platform/base/running_program.h"

#include <unistd.h>

#include <climits>

#include "platform/base/paths.h"

namespace brivo {

std::string runningProgramFolder() {
  char path[PATH_MAX];
  const ssize_t size = ::readlink("/proc/self/exe", path, sizeof path);
  return std::string(parentPath({path, size > 0 ? static_cast<std::size_t>(size) : 0}));
}

}  // namespace brivo
