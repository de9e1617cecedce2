// SPDX-License-Identifier: MIT
// Immutable bytes with shared ownership.
#pragma once

#include <cstddef>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace brivo {

/// A view of bytes together with a share in whatever keeps them alive; copying it copies no byte.
/// The last copy's end releases the memory. *Immutable.*
class Data {
 public:
  Data() = default;
  explicit Data(std::vector<std::byte> bytes);
  /// `owner` keeps `bytes` valid and unchanged; its deleter is the release action. `memfd` is a
  /// descriptor (borrowed from the owner) of a sealed memory file that holds the bytes from offset
  /// 0, or -1.
  Data(std::span<const std::byte> bytes, std::shared_ptr<const void> owner, int memfd = -1)
      : bytes_(bytes), owner_(std::move(owner)), memfd_(memfd) {}

  static Data copyOf(std::span<const std::byte> bytes);
  static Data copyOf(std::string_view text);

  std::span<const std::byte> bytes() const { return bytes_; }
  std::size_t size() const { return bytes_.size(); }
  bool empty() const { return bytes_.empty(); }
  /// The first `count` bytes, or all when there are no more; shares the memory.
  Data first(std::size_t count) const;
  /// The bytes as text, valid as long as this data.
  std::string_view text() const;
  /// The memory file behind the bytes, -1 when there is none; valid as long as this data.
  int memfd() const { return memfd_; }

  /// Compares the bytes, not where they come from.
  friend bool operator==(const Data& a, const Data& b) { return a.text() == b.text(); }

 private:
  std::span<const std::byte> bytes_;
  std::shared_ptr<const void> owner_;
  int memfd_ = -1;
};

}  // namespace brivo
