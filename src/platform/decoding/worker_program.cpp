// SPDX-License-Identifier: MIT
#include "platform/decoding/worker_program.h"

#include <unistd.h>

#include "platform/base/running_program.h"

namespace brivo {

namespace {

constexpr const char* kName = "/brivod-imaging";

}  // namespace

std::string installedWorkerProgram() {
  const std::string folder = runningProgramFolder();
  // An installed tree may have been moved.
  for (const std::string& path : {folder + kName, folder + BRIVOD_LIBEXEC_FROM_BIN_DIR + kName}) {
    if (::access(path.c_str(), X_OK) == 0) return path;
  }
  return std::string(BRIVOD_INSTALLED_LIBEXEC_DIR) + kName;
}

}  // namespace brivo
