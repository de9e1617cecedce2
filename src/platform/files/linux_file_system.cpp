// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <optional>

#include "platform/base/directory.h"
#include "platform/base/paths.h"
#include "platform/files/file_system.h"

namespace brivo {

namespace {

constexpr unsigned kWantedValues = STATX_TYPE | STATX_MODE | STATX_SIZE | STATX_MTIME | STATX_BTIME;

SystemError failed(const char* what, std::string_view path) {
  return {std::string(what) + " " + std::string(path), errno};
}

/// Refuses symbolic links in every component, the last included (openat2(2), Linux 5.6).
UniqueFd openWithoutLinks(const std::string& path, std::uint64_t flags) {
  open_how how{};
  how.flags = flags | O_CLOEXEC;
  how.resolve = RESOLVE_NO_SYMLINKS;
  int fd = -1;
  do {
    fd = static_cast<int>(::syscall(SYS_openat2, AT_FDCWD, path.c_str(), &how, sizeof how));
  } while (fd < 0 && errno == EINTR);
  return UniqueFd(fd);
}

FileTime fileTime(const statx_timestamp& time) { return {time.tv_sec, time.tv_nsec}; }

/// The values of `name` in `folder`, or of `folder` itself when the name is empty.
std::optional<ResourceValues> valuesAt(int folder, const char* name) {
  const int flags = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | (*name ? 0 : AT_EMPTY_PATH);
  struct statx status {};
  if (::statx(folder, name, flags, kWantedValues, &status) != 0) return std::nullopt;
  if (!S_ISREG(status.stx_mode) && !S_ISDIR(status.stx_mode)) {
    errno = EINVAL;
    return std::nullopt;
  }
  ResourceValues values;
  values.size = status.stx_size;
  values.modified = fileTime(status.stx_mtime);
  values.created = (status.stx_mask & STATX_BTIME) != 0 ? fileTime(status.stx_btime) : values.modified;
  values.directory = S_ISDIR(status.stx_mode);
  values.writable = ::faccessat(folder, name, W_OK, flags & ~AT_NO_AUTOMOUNT) == 0;
  return values;
}

Directory openDirectory(const std::string& path) {
  return listDirectory(openWithoutLinks(path, O_RDONLY | O_DIRECTORY | O_NONBLOCK));
}

/// Calls `visit` with each name that is not hidden; an error when the listing breaks off.
template <class Visit>
std::optional<SystemError> forEachName(const std::string& path, Visit visit) {
  const Directory directory = openDirectory(path);
  if (!directory) return failed("list", path);
  while (true) {
    errno = 0;
    const dirent* entry = ::readdir(directory.get());
    if (!entry) break;
    if (entry->d_name[0] != '.') visit(::dirfd(directory.get()), entry->d_name);
  }
  if (errno != 0) return failed("list", path);
  return std::nullopt;
}

class LinuxFileSystem final : public FileSystem {
 public:
  Result<ResourceValues> resourceValues(const std::string& path) override {
    const UniqueFd fd = openWithoutLinks(path, O_PATH);
    const auto values = fd ? valuesAt(fd.get(), "") : std::nullopt;
    if (!values) return failed("look at", path);
    return *values;
  }

  Result<std::vector<std::string>> names(const std::string& directory) override {
    std::vector<std::string> names;
    const auto error = forEachName(directory, [&](int, const char* name) { names.emplace_back(name); });
    if (error && names.empty()) return *error;
    return names;
  }

  Result<std::vector<DirectoryEntry>> entries(const std::string& directory) override {
    std::vector<DirectoryEntry> entries;
    const auto error = forEachName(directory, [&](int folder, const char* name) {
      const auto values = valuesAt(folder, name);
      entries.push_back({name, values.has_value(), values.value_or(ResourceValues())});
    });
    if (error && entries.empty()) return *error;
    return entries;
  }

  Result<UniqueFd> open(const std::string& path) override {
    // Not blocking: a FIFO must not hold us up before we have seen what it is.
    UniqueFd fd = openWithoutLinks(path, O_RDONLY | O_NONBLOCK | O_NOCTTY);
    struct stat status {};
    if (!fd || ::fstat(fd.get(), &status) != 0) return failed("open", path);
    if (!S_ISREG(status.st_mode)) return SystemError{"open " + path, EINVAL};
    return fd;
  }

  std::int64_t read(int fd, std::span<std::byte> buffer, std::uint64_t offset) override {
    std::size_t total = 0;
    while (total < buffer.size()) {
      const auto rest = buffer.subspan(total);
      const ssize_t count = ::pread(fd, rest.data(), rest.size(), static_cast<off_t>(offset + total));
      if (count < 0 && errno == EINTR) continue;
      if (count < 0 && total == 0) return -1;
      if (count <= 0) break;
      total += static_cast<std::size_t>(count);
    }
    return static_cast<std::int64_t>(total);
  }

  std::optional<SystemError> remove(const std::string& path) override {
    const UniqueFd folder = openWithoutLinks(std::string(parentPath(path)), O_PATH | O_DIRECTORY);
    const std::string name(lastPathComponent(path));
    if (!folder || ::unlinkat(folder.get(), name.c_str(), 0) != 0) return failed("remove", path);
    return std::nullopt;
  }
};

}  // namespace

FileSystem& systemFiles() {
  static LinuxFileSystem files;
  return files;
}

}  // namespace brivo
