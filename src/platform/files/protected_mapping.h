// SPDX-License-Identifier: MIT
// Mapped files on media that may go away.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

#include "platform/base/mapping.h"

namespace brivo {

/// A part of a file, mapped for reading. Where the medium or the file has gone, its bytes read as zeros
/// instead of ending the process with SIGBUS: the first fault of a mapping replaces the rest of it, from the
/// faulting page on, by zero pages. A system call that is given such a page says EFAULT until somebody has
/// touched it. Any number of threads may read; they must be done before the mapping goes. *Immutable*, but
/// for faulted().
class ProtectedMapping {
 public:
  /// Mappings that can exist at a time.
  static constexpr std::size_t kMost = 1024;

  /// `length` bytes of `fd` from `offset` on, which need not be on a page border. Null when the kernel
  /// refuses or kMost exist; errno tells why. The first call installs the process's handler of SIGBUS; faults
  /// elsewhere go on to the handler that was there before.
  static std::unique_ptr<ProtectedMapping> map(int fd, std::size_t length, std::uint64_t offset);
  ~ProtectedMapping();
  ProtectedMapping(const ProtectedMapping&) = delete;
  ProtectedMapping& operator=(const ProtectedMapping&) = delete;

  std::span<const std::byte> bytes() const { return bytes_; }
  /// True when bytes that were touched could not be read: they are zeros, not what the file held.
  bool faulted() const;

 private:
  ProtectedMapping(Mapping mapping, std::size_t skipped, std::size_t length, std::size_t slot);

  const Mapping mapping_;  // whole pages
  const std::span<const std::byte> bytes_;
  const std::size_t slot_;
};

}  // namespace brivo
