// SPDX-License-Identifier: MIT
#include "platform/images/byte_source.h"

#include <algorithm>

namespace brivo::images {

std::size_t MemorySource::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  if (offset >= bytes_.size()) return 0;
  const auto rest = bytes_.subspan(static_cast<std::size_t>(offset));
  const std::size_t count = std::min(rest.size(), buffer.size());
  std::ranges::copy(rest.first(count), buffer.begin());
  return count;
}

bool readAll(const ByteSource& source, std::span<std::byte> buffer, std::uint64_t offset) {
  while (!buffer.empty()) {
    const std::size_t count = source.read(buffer, offset);
    if (count == 0) return false;
    buffer = buffer.subspan(count);
    offset += count;
  }
  return true;
}

}  // namespace brivo::images
