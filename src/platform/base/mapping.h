// SPDX-License-Identifier: MIT
// The owner of one memory mapping.
#pragma once

#include <cstddef>
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
  /// The first `size` bytes of `fd`, shared and read-only. Only for files that cannot shrink:
  /// reading past a file's end raises SIGBUS. Empty on failure; errno tells why.
  static Mapping sharedReadable(int fd, std::size_t size);

  explicit operator bool() const { return !bytes_.empty(); }
  std::size_t size() const { return bytes_.size(); }
  /// Writable only when the mapping was made writable.
  std::span<std::byte> bytes() const { return bytes_; }

 private:
  explicit Mapping(std::span<std::byte> bytes) : bytes_(bytes) {}
  static Mapping map(std::size_t size, int protection, int flags, int fd);

  std::span<std::byte> bytes_;
};

}  // namespace brivo
