// SPDX-License-Identifier: MIT
// The owner of one memory mapping.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace brivo {

/// Unmaps its region when it goes. *Thread-bound.*
class Mapping {
 public:
  Mapping() = default;
  Mapping(Mapping&& other) noexcept;
  Mapping& operator=(Mapping&& other) noexcept;
  ~Mapping();

  /// `size` bytes of fresh zeroed memory of this process, readable and writable. Empty on failure.
  static Mapping anonymous(std::size_t size);
  /// The first `size` bytes of `fd`, shared and writable. Empty on failure; errno tells why.
  static Mapping sharedWritable(int fd, std::size_t size);
  /// `size` bytes of `fd` from `offset` on, a page border, shared and read-only. Reading past a file's
  /// end raises SIGBUS: for files that cannot shrink, and for ProtectedMapping. Empty on failure;
  /// errno tells why.
  static Mapping sharedReadable(int fd, std::size_t size, std::uint64_t offset = 0);

  explicit operator bool() const { return !bytes_.empty(); }
  std::size_t size() const { return bytes_.size(); }
  /// Writable only when the mapping was made writable.
  std::span<std::byte> bytes() const { return bytes_; }

 private:
  explicit Mapping(std::span<std::byte> bytes) : bytes_(bytes) {}
  static Mapping map(std::size_t size, int protection, int flags, int fd, std::uint64_t offset = 0);

  std::span<std::byte> bytes_;
};

}  // namespace brivo
