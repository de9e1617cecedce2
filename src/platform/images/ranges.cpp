// SPDX-License-Identifier: MIT
#include "platform/images/ranges.h"

#include <algorithm>

namespace brivo::images {

std::span<const std::byte> Ranges::bytes(std::uint64_t offset, std::size_t length) {
  if (offset > size() || length > size() - offset) return {};
  for (const Range& range : fetched_) {
    if (offset < range.offset || offset - range.offset > range.bytes.size()) continue;
    const auto rest = range.bytes.subspan(static_cast<std::size_t>(offset - range.offset));
    if (length <= rest.size()) return rest.first(length);
  }
  return fetch(offset, length);
}

std::span<const std::byte> Ranges::upTo(std::uint64_t offset, std::size_t length) {
  if (offset >= size()) return {};
  return bytes(offset, static_cast<std::size_t>(std::min<std::uint64_t>(length, size() - offset)));
}

std::span<const std::byte> Ranges::fetch(std::uint64_t offset, std::size_t length) {
  if (limits_.ranges == 0 || length > limits_.bytes || length == 0) return {};
  const auto before =
      static_cast<std::size_t>(std::min<std::uint64_t>({limits_.before, limits_.bytes - length, offset}));
  const std::size_t wanted = std::min(std::max(before + length, limits_.usual), limits_.bytes);
  const std::uint64_t start = offset - before;
  const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(wanted, size() - start));
  Range range{start, std::make_unique_for_overwrite<std::byte[]>(count), {}};
  const std::size_t got = source_.read({range.memory.get(), count}, start);
  --limits_.ranges;
  limits_.bytes -= count;
  range.bytes = {range.memory.get(), got};
  fetched_.push_back(std::move(range));
  return before + length <= got ? fetched_.back().bytes.subspan(before, length)
                                : std::span<const std::byte>();
}

}  // namespace brivo::images
