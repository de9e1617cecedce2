// SPDX-License-Identifier: MIT
// Memory that can travel to another process without being copied.
#pragma once

#include <cstddef>
#include <optional>
#include <span>

#include "platform/base/data.h"
#include "platform/base/mapping.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// A memfd of fixed size with a writable mapping, to be filled once and then sealed into a Data.
/// *Thread-bound.*
class MemoryFile {
 public:
  /// `size` zeroed bytes; `name` shows up in /proc only. None when memory or descriptors run out.
  static std::optional<MemoryFile> create(const char* name, std::size_t size);

  /// What to fill.
  std::span<std::byte> bytes() const { return mapping_.bytes(); }

  /// The first `used` bytes as immutable data that knows its memfd, sealed against shrinking,
  /// growing and new writable mappings (memfd_create(2), F_ADD_SEALS). None when the kernel refuses
  /// the seals.
  std::optional<Data> seal(std::size_t used) &&;

 private:
  MemoryFile(UniqueFd fd, Mapping mapping) : fd_(std::move(fd)), mapping_(std::move(mapping)) {}

  UniqueFd fd_;
  Mapping mapping_;
};

/// Data over a memfd that came from another process. None unless the file is sealed against
/// shrinking (its owner could else make our reads fault) and holds at least `size` bytes.
std::optional<Data> dataFromSealedMemfd(UniqueFd fd, std::size_t size);

}  // namespace brivo
