// SPDX-License-Identifier: MIT
#include "bare_walk.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <memory>
#include <span>
#include <stdexcept>
#include <vector>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

namespace {

constexpr unsigned kWantedValues = STATX_TYPE | STATX_MODE | STATX_SIZE | STATX_MTIME | STATX_BTIME;

UniqueFd openWithoutLinks(const std::string& path, std::uint64_t flags) {
  open_how how{};
  how.flags = flags | O_CLOEXEC;
  how.resolve = RESOLVE_NO_SYMLINKS;
  UniqueFd fd(static_cast<int>(::syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof how)));
  if (!fd) throw std::runtime_error("cannot open " + path);
  return fd;
}

template <class Visit>
void forEachName(const std::string& path, Visit visit) {
  UniqueFd fd = openWithoutLinks(path, O_RDONLY | O_DIRECTORY | O_NONBLOCK);
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(::fdopendir(fd.get()), &::closedir);
  if (!directory) throw std::runtime_error("cannot list " + path);
  (void)fd.release();
  while (const dirent* entry = ::readdir(directory.get())) {
    if (entry->d_name[0] != '.') visit(::dirfd(directory.get()), entry->d_name);
  }
}

bool askValues(int folder, const char* name, int flags) {
  struct statx status {};
  if (::statx(folder, name, AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | flags, kWantedValues, &status) != 0)
    return false;
  return ::faccessat(folder, name, W_OK, AT_SYMLINK_NOFOLLOW | flags) == 0;
}

bool readHead(int folder, const char* name, std::span<char> buffer) {
  struct statx status {};
  if (::statx(folder, name, AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT, kWantedValues, &status) != 0) return false;
  const UniqueFd file(::openat(folder, name, O_RDONLY | O_CLOEXEC));
  return file && ::pread(file.get(), buffer.data(), buffer.size(), 0) > 0;
}

/// The paths of the folders in DCIM; `visit` sees each entry.
template <class Visit>
std::vector<std::string> foldersOf(const std::string& media, Visit visit) {
  std::vector<std::string> folders;
  forEachName(media, [&](int fd, const char* name) {
    visit(fd, name);
    folders.push_back(media + "/" + name);
  });
  return folders;
}

}  // namespace

std::size_t countNames(const std::string& card) {
  std::size_t names = 0;
  for (const std::string& folder : foldersOf(card + "/DCIM", [](int, const char*) {})) {
    forEachName(folder, [&](int, const char*) { ++names; });
  }
  return names;
}

std::size_t walkWithValues(const std::string& card, const std::function<void()>& eachFile) {
  const std::string media = card + "/DCIM";
  askValues(openWithoutLinks(media, O_PATH).get(), "", AT_EMPTY_PATH);
  std::size_t files = 0;
  for (const std::string& folder :
       foldersOf(media, [](int fd, const char*name) { askValues(fd, name, 0); })) {
    forEachName(folder, [&](int fd, const char* name) {
      files += askValues(fd, name, 0) ? 1 : 0;
      eachFile();
    });
  }
  return files;
}

std::size_t readHeads(const std::string& card) {
  std::vector<char> buffer(64 * 1024);
  std::size_t files = 0;
  for (const std::string& folder : foldersOf(card + "/DCIM", [](int, const char*) {})) {
    forEachName(folder, [&](int fd, const char* name) { files += readHead(fd, name, buffer) ? 1 : 0; });
  }
  return files;
}

}  // namespace brivo::bench
