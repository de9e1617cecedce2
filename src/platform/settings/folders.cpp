// SPDX-License-Identifier: MIT
#include "platform/settings/folders.h"

#include <sys/stat.h>

#include <cerrno>

#include "platform/base/paths.h"

namespace brivo {

std::optional<SystemError> makePrivateFolder(const std::string& path) {
  if (::mkdir(path.c_str(), 0700) == 0) return std::nullopt;
  const int error = errno;
  struct stat status {};
  if (error == EEXIST && ::stat(path.c_str(), &status) == 0 && S_ISDIR(status.st_mode)) return std::nullopt;
  return SystemError{"make " + path, error};
}

std::optional<SystemError> makeBaseDirectory(const std::string& path) {
  auto error = makePrivateFolder(path);
  if (!error || error->code != ENOENT || path.size() < 2) return error;
  if (auto above = makeBaseDirectory(std::string(parentPath(path)))) return above;
  return makePrivateFolder(path);
}

}  // namespace brivo
