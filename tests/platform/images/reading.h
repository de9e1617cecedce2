// SPDX-License-Identifier: MIT
// Reading of made-up files in tests.
#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "platform/images/image_reader.h"
#include "support/image_bytes.h"

namespace brivo::images {

/// Owns its bytes and counts what is fetched.
class CountingSource final : public ByteSource {
 public:
  explicit CountingSource(std::string bytes) : bytes_(std::move(bytes)) {}
  std::uint64_t size() const override { return bytes_.size(); }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++reads_;
    const std::size_t count = MemorySource(std::as_bytes(std::span(bytes_))).read(buffer, offset);
    bytesRead_ += count;
    return count;
  }
  std::size_t reads() const { return reads_; }
  std::size_t bytesRead() const { return bytesRead_; }

 private:
  const std::string bytes_;
  mutable std::size_t reads_ = 0;
  mutable std::size_t bytesRead_ = 0;
};

inline std::optional<ImageProperties> readBasics(std::string_view file) {
  return copySequentialProperties(MemorySource(std::as_bytes(std::span(file))));
}
inline std::optional<ImageProperties> readAll(std::string_view file) {
  return copyImageProperties(MemorySource(std::as_bytes(std::span(file))));
}
inline std::optional<ImageProperties> readPreviews(std::string_view file) {
  return copyContainerProperties(MemorySource(std::as_bytes(std::span(file))));
}

}  // namespace brivo::images
