// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace brivo::images {

/// What a zlib stream (RFC 1950) holds; empty when it is damaged or holds more than `most` bytes.
std::vector<std::byte> inflated(std::span<const std::byte> stream, std::size_t most);

}  // namespace brivo::images
