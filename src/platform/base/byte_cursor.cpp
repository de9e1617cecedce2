// SPDX-License-Identifier: MIT
#include "platform/base/byte_cursor.h"

namespace brivo {

void ByteCursor::seek(std::size_t position) {
  if (position > bytes_.size()) {
    ok_ = false;
    return;
  }
  position_ = position;
}

std::span<const std::byte> ByteCursor::take(std::size_t count) {
  if (count > remaining()) {
    ok_ = false;
    position_ = bytes_.size();
    return {};
  }
  const auto taken = bytes_.subspan(position_, count);
  position_ += count;
  return taken;
}

std::uint64_t ByteCursor::integer(std::size_t width) {
  const auto raw = take(width);
  std::uint64_t value = 0;
  if (order_ == std::endian::big) {
    for (const std::byte byte : raw) value = value << 8 | std::to_integer<std::uint64_t>(byte);
  } else {
    for (std::size_t i = raw.size(); i-- > 0;) value = value << 8 | std::to_integer<std::uint64_t>(raw[i]);
  }
  return value;
}

}  // namespace brivo
