// SPDX-License-Identifier: MIT
// Files of this machine in the making.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"
#include "platform/files/file_system.h"

namespace brivo {

/// A file that is written under a name of its own and gets its final name in one step, when it is whole. What
/// goes without publish() or discard() stays under the first name, for the next open() to go on with.
/// *Thread-bound.*
class PartFile {
 public:
  /// Creates the part, or opens the one that is there, and locks it; an error of the code EWOULDBLOCK when
  /// somebody else has it. `path` is in the folder of the final name.
  static Result<std::unique_ptr<PartFile>> open(const std::string& path);
  ~PartFile() = default;
  PartFile(const PartFile&) = delete;
  PartFile& operator=(const PartFile&) = delete;

  /// Bytes that are there.
  std::uint64_t size() const { return size_; }

  // None, or what went wrong; ENOSPC for a full disk.
  /// Keeps the first `size` bytes.
  [[nodiscard]] std::optional<SystemError> truncate(std::uint64_t size);
  /// Takes room for a file of `size` bytes, where the file system can.
  [[nodiscard]] std::optional<SystemError> reserve(std::uint64_t size);
  [[nodiscard]] std::optional<SystemError> append(std::span<const std::byte> bytes);
  /// Has the disk begin to write what it was given. Does not wait.
  void startWriting();
  /// Waits until all bytes are on disk (fsync(2)).
  [[nodiscard]] std::optional<SystemError> synchronize();
  /// Makes the next reads come from the disk, as far as the file system can (posix_fadvise(2)). After
  /// synchronize().
  void dropFromCache();
  /// Access and modification time.
  [[nodiscard]] std::optional<SystemError> setTimes(FileTime time);

  /// Reads from `offset` until `buffer` is full or the file ends: bytes read.
  Result<std::size_t> read(std::span<std::byte> buffer, std::uint64_t offset) const;

  /// Gives the file its name, in place of a file that has it, and waits until the folder is on disk.
  [[nodiscard]] std::optional<SystemError> publish(const std::string& path);
  /// The same, but an error of the code EEXIST, and nothing done, when the name is taken.
  [[nodiscard]] std::optional<SystemError> publishAsNew(const std::string& path);
  /// Removes the file.
  void discard();

 private:
  PartFile(std::string path, UniqueFd fd, std::uint64_t size)
      : path_(std::move(path)), fd_(std::move(fd)), size_(size) {}
  SystemError error(const char* what) const;
  std::optional<SystemError> synchronizeFolder() const;

  const std::string path_;
  const UniqueFd fd_;
  std::uint64_t size_;
};

}  // namespace brivo
