// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// A file within a file: the `length` bytes from `offset` on, or fewer where the outer one ends earlier.
/// *Thread-bound.*
class SliceSource final : public images::ByteSource {
 public:
  /// `outer` must outlive this.
  SliceSource(const images::ByteSource& outer, std::uint64_t offset, std::uint64_t length);

  std::uint64_t size() const override { return size_; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override;

 private:
  const images::ByteSource& outer_;
  const std::uint64_t start_;
  const std::uint64_t size_;
};

}  // namespace brivo::imaging
