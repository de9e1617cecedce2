// SPDX-License-Identifier: MIT
// Memory files, and the seals by which processes that do not trust each other share them (memfd_create(2)).
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

#include "platform/base/unique_fd.h"

namespace brivo {

/// A zeroed memory file of `size` bytes that can be sealed; `name` shows up in /proc only. None when memory
/// or descriptors run out; errno tells why.
UniqueFd makeMemfd(const char* name, std::size_t size);

/// Seals for good against shrinking, growing and new ways to write; mappings that are there stay writable.
/// False when the kernel refuses.
bool sealForReaders(int fd);
/// Seals for good against every change. False when the kernel refuses, as it does while a writable mapping is
/// there (EBUSY).
bool sealForGood(int fd);
/// Seals against shrinking, after which no access to a mapping can fault. False when the kernel refuses.
bool sealAgainstShrinking(int fd);

/// What tells one memory file from others, and its size.
struct MemfdStatus {
  std::uint64_t device;
  std::uint64_t inode;
  std::uint64_t size;  ///< bytes
};
/// None unless `fd` is a memory file that cannot shrink. Other files are not touched: asking one on a file
/// system that does not answer would wait.
std::optional<MemfdStatus> statusOfUnshrinkable(int fd);

}  // namespace brivo
