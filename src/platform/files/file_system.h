// SPDX-License-Identifier: MIT
// Files below a volume's root: what a card holds, and nothing that a card may point to.
#pragma once

#include <compare>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// A point in time as file systems keep it: seconds since 1970, UTC, and nanoseconds from 0 to 999,999,999.
struct FileTime {
  std::int64_t seconds = 0;
  std::int64_t nanoseconds = 0;
  friend auto operator<=>(const FileTime&, const FileTime&) = default;
};

/// What the file system knows of a regular file or a directory.
struct ResourceValues {
  std::uint64_t size = 0;  ///< bytes
  FileTime created;        ///< the modification time where the file system keeps no creation time
  FileTime modified;
  bool directory = false;
  bool writable = false;  ///< access(2) says this process may write; false on a read-only mount
};

/// One name in a directory.
struct DirectoryEntry {
  std::string name;  ///< bytes as they are on the volume, which need not be UTF-8
  /// False for anything but a regular file or a directory (symbolic links, FIFOs, devices, sockets), and for
  /// what went away or cannot be asked; the values are empty then.
  bool hasValues = false;
  ResourceValues values;
};

/// File operations on absolute paths. No component of a path may be a symbolic link, and nothing but regular
/// files is ever opened. A call blocks as long as the medium does. *Thread-safe.*
class FileSystem {
 public:
  virtual ~FileSystem() = default;

  /// The values of one file or directory; an error for anything else.
  virtual Result<ResourceValues> resourceValues(const std::string& path) = 0;
  /// The names in a directory that do not begin with a dot, in the order of the file system.
  virtual Result<std::vector<std::string>> names(const std::string& directory) = 0;
  /// The same with the values of each entry; one pass, and no descriptor is left open.
  virtual Result<std::vector<DirectoryEntry>> entries(const std::string& directory) = 0;
  /// Opens a regular file for reading.
  virtual Result<UniqueFd> open(const std::string& path) = 0;
  /// Reads from `offset` until `buffer` is full or the file ends. Bytes read, fewer at the end of the file or
  /// where the medium failed; -1 when it failed at once.
  virtual std::int64_t read(int fd, std::span<std::byte> buffer, std::uint64_t offset) = 0;
  /// Unlinks a file. The error's code tells a missing file (ENOENT) from the rest.
  [[nodiscard]] virtual std::optional<SystemError> remove(const std::string& path) = 0;
};

/// The file systems of this machine.
FileSystem& systemFiles();

}  // namespace brivo
