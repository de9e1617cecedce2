// SPDX-License-Identifier: MIT
#include "platform/files/part_file.h"

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "platform/base/paths.h"

namespace brivo {

namespace {

std::string folderOf(const std::string& path) {
  return path.find('/') == std::string::npos ? "." : std::string(parentPath(path));
}

/// Whoever had the lock before may have given the file another name, or removed it.
bool isStillAt(int fd, const std::string& path) {
  struct stat opened {};
  struct stat named {};
  return ::fstat(fd, &opened) == 0 && ::lstat(path.c_str(), &named) == 0 && opened.st_dev == named.st_dev &&
         opened.st_ino == named.st_ino;
}

}  // namespace

Result<std::unique_ptr<PartFile>> PartFile::open(const std::string& path) {
  for (;;) {
    UniqueFd fd(::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0666));
    if (!fd) return SystemError{"create a file beside " + path, errno};
    if (::flock(fd.get(), LOCK_EX | LOCK_NB) != 0) return SystemError{"lock " + path, errno};
    if (!isStillAt(fd.get(), path)) continue;
    const off_t size = ::lseek(fd.get(), 0, SEEK_END);
    if (size < 0) return SystemError{"look at " + path, errno};
    return std::unique_ptr<PartFile>(new PartFile(path, std::move(fd), static_cast<std::uint64_t>(size)));
  }
}

SystemError PartFile::error(const char* what) const { return {what + (" " + path_), errno}; }

std::optional<SystemError> PartFile::truncate(std::uint64_t size) {
  if (::ftruncate(fd_.get(), static_cast<off_t>(size)) != 0 ||
      ::lseek(fd_.get(), static_cast<off_t>(size), SEEK_SET) < 0) {
    return error("shorten");
  }
  size_ = size;
  return std::nullopt;
}

std::optional<SystemError> PartFile::reserve(std::uint64_t size) {
  if (size <= size_ || ::fallocate(fd_.get(), FALLOC_FL_KEEP_SIZE, 0, static_cast<off_t>(size)) == 0 ||
      errno != ENOSPC) {
    return std::nullopt;  // what cannot reserve finds out when it writes
  }
  return error("write");
}

std::optional<SystemError> PartFile::append(std::span<const std::byte> bytes) {
  while (!bytes.empty()) {
    const ssize_t written = ::write(fd_.get(), bytes.data(), bytes.size());
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return error("write");
    size_ += static_cast<std::uint64_t>(written);
    bytes = bytes.subspan(static_cast<std::size_t>(written));
  }
  return std::nullopt;
}

void PartFile::startWriting() { ::sync_file_range(fd_.get(), 0, 0, SYNC_FILE_RANGE_WRITE); }

std::optional<SystemError> PartFile::synchronize() {
  if (::fsync(fd_.get()) != 0) return error("write");
  return std::nullopt;
}

void PartFile::dropFromCache() { ::posix_fadvise(fd_.get(), 0, 0, POSIX_FADV_DONTNEED); }

std::optional<SystemError> PartFile::setTimes(FileTime time) {
  const timespec stamp{static_cast<time_t>(time.seconds), static_cast<long>(time.nanoseconds)};
  const timespec times[2] = {stamp, stamp};
  if (::futimens(fd_.get(), times) != 0) return error("set the times of");
  return std::nullopt;
}

Result<std::size_t> PartFile::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  const std::int64_t count = systemFiles().read(fd_.get(), buffer, offset);
  if (count < 0) return error("read");
  return static_cast<std::size_t>(count);
}

std::optional<SystemError> PartFile::publish(const std::string& path) {
  if (::rename(path_.c_str(), path.c_str()) != 0) return SystemError{"write " + path, errno};
  return synchronizeFolder();
}

std::optional<SystemError> PartFile::publishAsNew(const std::string& path) {
  // Not every file system can rename without replacing; those are asked first.
  const auto refused = [](int code) { return code == EINVAL || code == ENOSYS || code == ENOTSUP; };
  if (::syscall(SYS_renameat2, AT_FDCWD, path_.c_str(), AT_FDCWD, path.c_str(), RENAME_NOREPLACE) == 0)
    return synchronizeFolder();
  if (!refused(errno)) return SystemError{"write " + path, errno};
  if (::access(path.c_str(), F_OK) == 0) return SystemError{"write " + path, EEXIST};
  return publish(path);
}

std::optional<SystemError> PartFile::synchronizeFolder() const {
  const UniqueFd folder(::open(folderOf(path_).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (folder && ::fsync(folder.get()) == 0) return std::nullopt;
  if (folder && errno == EINVAL) return std::nullopt;  // a file system whose folders need none
  return SystemError{"write the folder of " + path_, errno};
}

void PartFile::discard() { ::unlink(path_.c_str()); }

}  // namespace brivo
