// SPDX-License-Identifier: MIT
#include "platform/zeph/runtime_folder.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string_view>
#include <thread>

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

/// Takes the lock, as soon as whoever has it lets go within `patience`.
bool takeLock(const UniqueFd& file, std::chrono::milliseconds patience) {
  constexpr std::chrono::milliseconds pause{10};
  const auto deadline = std::chrono::steady_clock::now() + patience;
  while (::flock(file.get(), LOCK_EX | LOCK_NB) != 0) {
    if (std::chrono::steady_clock::now() >= deadline) return false;
    std::this_thread::sleep_for(pause);
  }
  return true;
}

}  // namespace

Result<std::unique_ptr<RuntimeFolder>> RuntimeFolder::claim(const std::string& path,
                                                            std::chrono::milliseconds patience) {
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
  if (!takeLock(lock, patience)) return SystemError{"another service is running in " + path};
  removeSockets(path);
  return std::unique_ptr<RuntimeFolder>(new RuntimeFolder(path, std::move(lock)));
}

}  // namespace brivo::zeph
