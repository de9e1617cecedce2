// SPDX-License-Identifier: MIT
// Memory that one process lends to another to be written into.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <utility>

namespace brivo {

class Mapping;
class UniqueFd;

/// A memfd on its way from the process that owns it to the one that fills it. Whoever receives one knows
/// nothing of it yet: mapped() finds out. *Immutable*; copies stand for the same file.
class SharedBuffer {
 public:
  /// Device and inode: the same for all descriptors of one file, as long as one of them or a mapping is
  /// there.
  using Identity = std::pair<std::uint64_t, std::uint64_t>;

  /// What another process sent: a descriptor of anything, and how many bytes it is said to hold.
  SharedBuffer(UniqueFd fd, std::uint64_t size);
  /// Zeroed memory of `size` bytes, sealed against shrinking (memfd_create(2)). None when memory or
  /// descriptors run out.
  static std::optional<SharedBuffer> create(const char* name, std::size_t size);

  /// Borrowed.
  int fd() const;
  std::uint64_t size() const { return size_; }
  /// None unless the descriptor is a memfd that cannot shrink. Other files are not touched: asking one on a
  /// file system that does not answer would wait.
  std::optional<Identity> identity() const;
  /// The first `size` bytes, readable and writable. Empty unless the descriptor is a memfd that cannot shrink
  /// and that holds what it is said to, which is `size` at least.
  Mapping mapped(std::size_t size) const;

  friend bool operator==(const SharedBuffer& a, const SharedBuffer& b) { return a.fd_ == b.fd_; }

 private:
  std::shared_ptr<const UniqueFd> fd_;
  std::uint64_t size_;
};

}  // namespace brivo
