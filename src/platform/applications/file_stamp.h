// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <cstdint>
#include <string>

namespace brivo {

/// True when an error of the system about a path says that nothing is there; after any other error there may
/// be.
bool meansNothingThere(int error);

/// What stat(2) said of a path, links followed. A later stamp of the path differs when something else is
/// there, or the same with another content or other rights. *Immutable.*
struct FileStamp {
  int error = 0;  ///< of stat(2); then the rest is 0
  mode_t mode = 0;
  off_t size = 0;
  dev_t device = 0;
  ino_t inode = 0;
  std::int64_t modified = 0;  ///< nanoseconds since 1970; anybody who may write the file can set it
  std::int64_t changed = 0;   ///< nanoseconds since 1970; the time of the last change of any of the above

  static FileStamp of(const std::string& path);

  bool operator==(const FileStamp& other) const = default;
  bool isFile() const;
  bool isFolder() const;
  /// Something may be there and cannot be looked at.
  bool isUnknown() const { return error != 0 && !meansNothingThere(error); }
};

}  // namespace brivo
