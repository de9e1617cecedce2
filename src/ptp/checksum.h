// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>

namespace brivo {

/// The CRC-16 of IEEE 1394 configuration data (IEEE 1212, generator x^16 + x^12 + x^5 + 1, starting at 0, the
/// most significant bit first) over `count` words in the machine's byte order; 0 for none. *Thread-safe.*
std::uint16_t FWComputeCRC16(const std::uint32_t* words, std::size_t count);

}  // namespace brivo
