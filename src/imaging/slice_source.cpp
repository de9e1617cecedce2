// SPDX-License-Identifier: MIT
#include "imaging/slice_source.h"

#include <algorithm>

namespace brivo::imaging {

SliceSource::SliceSource(const images::ByteSource& outer, std::uint64_t offset, std::uint64_t length)
    : outer_(outer), start_(std::min(offset, outer.size())), size_(std::min(length, outer.size() - start_)) {}

std::size_t SliceSource::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  if (offset >= size_) return 0;
  const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(buffer.size(), size_ - offset));
  return outer_.read(buffer.first(count), start_ + offset);
}

}  // namespace brivo::imaging
