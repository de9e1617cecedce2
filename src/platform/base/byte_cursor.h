// SPDX-License-Identifier: MIT
// The one way in which bytes of files and messages are read.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <span>

namespace brivo {

/// Walks a range of bytes and never leaves it. A read past the end gives zeros (or an empty range)
/// and marks the cursor as overrun for good, so that a parser reads a whole record and asks ok()
/// once. The bytes are borrowed. *Thread-bound.*
class ByteCursor {
 public:
  /// Integers are read in byte order `order` until setOrder().
  explicit ByteCursor(std::span<const std::byte> bytes, std::endian order = std::endian::little)
      : bytes_(bytes), order_(order) {}

  void setOrder(std::endian order) { order_ = order; }

  /// False from the first read or seek beyond the end on.
  bool ok() const { return ok_; }
  /// Bytes from the start to the next read.
  std::size_t position() const { return position_; }
  std::size_t remaining() const { return bytes_.size() - position_; }

  /// Moves to `position` from the start; the end itself is allowed.
  void seek(std::size_t position);
  void skip(std::size_t count) { (void)take(count); }

  std::uint8_t u8() { return static_cast<std::uint8_t>(integer(1)); }
  std::uint16_t u16() { return static_cast<std::uint16_t>(integer(2)); }
  std::uint32_t u32() { return static_cast<std::uint32_t>(integer(4)); }
  std::uint64_t u64() { return integer(8); }
  /// The next `count` bytes, borrowed; empty when there are fewer.
  std::span<const std::byte> take(std::size_t count);

 private:
  std::uint64_t integer(std::size_t width);

  std::span<const std::byte> bytes_;
  std::size_t position_ = 0;
  std::endian order_;
  bool ok_ = true;
};

}  // namespace brivo
