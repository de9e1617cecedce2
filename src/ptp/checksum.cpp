// SPDX-License-Identifier: MIT
#include "ptp/checksum.h"

#include <span>

namespace brivo {

std::uint16_t FWComputeCRC16(const std::uint32_t* words, std::size_t count) {
  std::uint32_t crc = 0;
  for (const std::uint32_t word : std::span(words, count)) {
    for (int shift = 28; shift >= 0; shift -= 4) {
      const std::uint32_t t = ((word >> shift) ^ (crc >> 12U)) & 0xFU;
      crc = ((crc << 4U) ^ (t << 12U) ^ (t << 5U) ^ t) & 0xFFFFU;
    }
  }
  return static_cast<std::uint16_t>(crc);
}

}  // namespace brivo
