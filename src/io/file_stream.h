// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <span>
#include <string>

#include "platform/base/unfair_lock.h"
#include "platform/base/unique_fd.h"
#include "platform/files/file_system.h"
#include "platform/files/protected_mapping.h"

namespace brivo {

/// The descriptor of one file, shared by its readers and counted: open() and close() pair up. *Thread-safe.*
/// A reader that is still reading when the last close comes reads on, and the descriptor goes after it.
class FileStream {
 public:
  /// Opens the file when no reader has it open, and counts one more reader. A file that cannot be opened
  /// counts as open too; reads of it fail. False, with nothing counted, only for the descriptor 0.
  bool open(FileSystem& files, const std::string& path) BRIVO_EXCLUDES(lock_);
  /// Counts one reader less; true when that was the last and the descriptor is closed.
  bool close() BRIVO_EXCLUDES(lock_);
  /// Reads into `buffer` from `offset`, no further than `size`, the size of the file as its catalogue entry
  /// says. Bytes read; 0 when the stream is not open or the offset is beyond the size, -1 when the medium
  /// failed.
  std::int64_t read(FileSystem& files, std::span<std::byte> buffer, std::uint64_t offset,
                    std::uint64_t size) const BRIVO_EXCLUDES(lock_);

  /// Maps `length` bytes from `offset` on for reading; null when the stream is not open or cannot be mapped.
  /// The mapping may outlive the stream.
  std::unique_ptr<ProtectedMapping> map(std::size_t length, std::uint64_t offset) const BRIVO_EXCLUDES(lock_);

  std::uint32_t streamCount() const BRIVO_EXCLUDES(lock_);

 private:
  using Descriptor = std::shared_ptr<const UniqueFd>;
  Descriptor descriptor() const BRIVO_EXCLUDES(lock_);

  mutable UnfairLock lock_;
  std::uint32_t count_ BRIVO_GUARDED_BY(lock_) = 0;
  Descriptor descriptor_ BRIVO_GUARDED_BY(lock_);  // null: not open; holding none: the open failed
};

}  // namespace brivo
