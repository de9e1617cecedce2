// SPDX-License-Identifier: MIT
#pragma once

#include "platform/base/unique_fd.h"
#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// The file behind a descriptor, which is borrowed.
class DescriptorSource final : public images::ByteSource {
 public:
  explicit DescriptorSource(const UniqueFd& file);
  std::uint64_t size() const override { return size_; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override;

 private:
  const UniqueFd& file_;
  std::uint64_t size_ = 0;
};

}  // namespace brivo::imaging
