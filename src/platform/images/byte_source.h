// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace brivo::images {

/// Where the bytes of an image come from. *Thread-bound.*
class ByteSource {
 public:
  virtual ~ByteSource() = default;
  /// Bytes that the image has.
  virtual std::uint64_t size() const = 0;
  /// Fills the start of `buffer` with bytes from `offset` on; how many there were, 0 when the medium failed.
  virtual std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const = 0;
};

/// Fills `buffer` with the bytes from `offset` on; false when not all of them are there.
bool readAll(const ByteSource& source, std::span<std::byte> buffer, std::uint64_t offset);

/// An image that is in memory already. The bytes are borrowed.
class MemorySource final : public ByteSource {
 public:
  explicit MemorySource(std::span<const std::byte> bytes) : bytes_(bytes) {}
  std::uint64_t size() const override { return bytes_.size(); }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override;

 private:
  const std::span<const std::byte> bytes_;
};

}  // namespace brivo::images
