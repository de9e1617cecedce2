// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

namespace brivo::images {

/// A part of a container that letters name: its content lies in `length` bytes from `start` on, if the file
/// goes that far. The letters are borrowed from the parse.
struct Chunk {
  std::string_view type;
  std::uint64_t start = 0;
  std::uint64_t length = 0;
};

/// Bytes of a file as letters, borrowed.
inline std::string_view lettersOf(std::span<const std::byte> bytes) {
  return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

}  // namespace brivo::images
