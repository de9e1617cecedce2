// SPDX-License-Identifier: MIT
#include "platform/applications/file_stamp.h"

#include <sys/stat.h>

#include <cerrno>

namespace brivo {

namespace {

std::int64_t nanoseconds(const timespec& time) {
  return std::int64_t{time.tv_sec} * 1'000'000'000 + time.tv_nsec;
}

}  // namespace

bool meansNothingThere(int error) {
  return error == ENOENT || error == ENOTDIR || error == ELOOP || error == ENAMETOOLONG;
}

FileStamp FileStamp::of(const std::string& path) {
  FileStamp stamp;
  struct stat status {};
  if (::stat(path.c_str(), &status) != 0) {
    stamp.error = errno;
    return stamp;
  }
  stamp.mode = status.st_mode;
  stamp.size = status.st_size;
  stamp.device = status.st_dev;
  stamp.inode = status.st_ino;
  stamp.modified = nanoseconds(status.st_mtim);
  stamp.changed = nanoseconds(status.st_ctim);
  return stamp;
}

bool FileStamp::isFile() const { return S_ISREG(mode); }

bool FileStamp::isFolder() const { return S_ISDIR(mode); }

}  // namespace brivo
