// SPDX-License-Identifier: MIT
#include "platform/base/data.h"

#include <algorithm>

namespace brivo {

Data::Data(std::vector<std::byte> bytes) {
  auto owner = std::make_shared<const std::vector<std::byte>>(std::move(bytes));
  bytes_ = *owner;
  owner_ = std::move(owner);
}

Data Data::copyOf(std::span<const std::byte> bytes) {
  return Data(std::vector<std::byte>(bytes.begin(), bytes.end()));
}

Data Data::copyOf(std::string_view text) { return copyOf(std::as_bytes(std::span(text))); }

Data Data::first(std::size_t count) const {
  Data part = *this;
  part.bytes_ = bytes_.first(std::min(count, bytes_.size()));
  return part;
}

std::string_view Data::text() const { return {reinterpret_cast<const char*>(bytes_.data()), bytes_.size()}; }

}  // namespace brivo
