// SPDX-License-Identifier: MIT
#include "platform/zeph/runtime_folder.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>

#include "platform/base/directory.h"

namespace brivo::zeph {

namespace {

void removeSockets(const std::string& path) {
  const Directory folder = listDirectory(path);
  if (!folder) return;
  while (const dirent* entry = ::readdir(folder.get())) {
    const std::string_view name = entry->d_name;
    if (name.starts_with("device-")) ::unlinkat(::dirfd(folder.get()), entry->d_name, 0);
  }
}

}  // namespace

Result<std::unique_ptr<RuntimeFolder>> RuntimeFolder::claim(const std::string& path) {
  if (path.empty())
    return SystemError{"no runtime folder: neither BRIVOD_RUNTIME_DIR nor XDG_RUNTIME_DIR is set"};
  if (::mkdir(path.c_str(), 0700) != 0 && errno != EEXIST) return SystemError{"make " + path, errno};
  const UniqueFd folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  struct stat status {};
  if (!folder || ::fstat(folder.get(), &status) != 0) return SystemError{"open " + path, errno};
  if (status.st_uid != ::getuid()) return SystemError{path + " belongs to another user"};
  if (::fchmod(folder.get(), 0700) != 0) return SystemError{"set the mode of " + path, errno};
  UniqueFd lock(::openat(folder.get(), "lock", O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600));
  if (!lock) return SystemError{"make a lock in " + path, errno};
  if (::flock(lock.get(), LOCK_EX | LOCK_NB) != 0) {
    return SystemError{"another service is running in " + path};
  }
  removeSockets(path);
  return std::unique_ptr<RuntimeFolder>(new RuntimeFolder(path, std::move(lock)));
}

}  // namespace brivo::zeph
