// SPDX-License-Identifier: MIT
#include "device/read_buffers.h"

#include <algorithm>

namespace brivo {

std::span<std::byte> ReadBuffers::memoryOf(const SharedBuffer& buffer, std::int32_t client,
                                           std::uint64_t length) {
  const auto identity = buffer.identity();
  if (!identity || length > kMostBytes) return {};
  std::deque<Registered>& registered = buffers_[client];
  auto known = std::ranges::find(registered, *identity, &Registered::identity);
  if (known != registered.end() &&
      known->mapping.size() < std::min<std::uint64_t>(buffer.size(), kMostBytes)) {
    registered.erase(known);  // said to be larger than it was said to be before
    known = registered.end();
  }
  if (known == registered.end()) {
    Mapping mapping = buffer.mapped(std::min<std::uint64_t>(buffer.size(), kMostBytes));
    if (!mapping) return {};
    if (registered.size() == kMostPerClient) registered.pop_front();
    known = registered.insert(registered.end(), Registered{*identity, std::move(mapping)});
  }
  if (length > std::min<std::uint64_t>(buffer.size(), known->mapping.size())) return {};
  return known->mapping.bytes().first(length);
}

}  // namespace brivo
