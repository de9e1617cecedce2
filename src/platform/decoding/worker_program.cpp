// SPDX-License-Identifier: MIT
#include "platform/decoding/worker_program.h"

#include <unistd.h>

#include <climits>

#include "platform/base/paths.h"

namespace brivo {

namespace {

constexpr const char* kName = "/brivod-imaging";

std::string runningProgram() {
  char path[PATH_MAX];
  const ssize_t size = ::readlink("/proc/self/exe", path, sizeof path);
  return {path, size > 0 ? static_cast<std::size_t>(size) : 0};
}

}  // namespace

std::string installedWorkerProgram() {
  const std::string folder(parentPath(runningProgram()));
  // An installed tree may have been moved.
  for (const std::string& path : {folder + kName, folder + BRIVOD_LIBEXEC_FROM_BIN_DIR + kName}) {
    if (::access(path.c_str(), X_OK) == 0) return path;
  }
  return std::string(BRIVOD_INSTALLED_LIBEXEC_DIR) + kName;
}

}  // namespace brivo
