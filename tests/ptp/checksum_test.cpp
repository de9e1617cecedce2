// SPDX-License-Identifier: MIT
#include "ptp/checksum.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace brivo {
namespace {

/// The same remainder one bit at a time: shift in a bit, subtract the generator when one falls out.
std::uint16_t bitByBit(const std::vector<std::uint32_t>& words) {
  std::uint16_t crc = 0;
  for (const std::uint32_t word : words) {
    for (int bit = 31; bit >= 0; --bit) {
      const bool out = ((crc >> 15) ^ (word >> bit)) & 1;
      crc = static_cast<std::uint16_t>(crc << 1);
      if (out) crc ^= 0x1021;
    }
  }
  return crc;
}

TEST(ChecksumTest, OverNoWordsItIs0) { EXPECT_EQ(FWComputeCRC16(nullptr, 0), 0); }

TEST(ChecksumTest, OverZeroWordsItIs0) {
  const std::vector<std::uint32_t> words(10);
  EXPECT_EQ(FWComputeCRC16(words.data(), words.size()), 0);
}

TEST(ChecksumTest, TheLowestBitAloneLeavesTheGenerator) {
  const std::uint32_t one = 1;
  EXPECT_EQ(FWComputeCRC16(&one, 1), 0x1021);
}

TEST(ChecksumTest, WordsGoInFromTheMostSignificantBit) {
  // "12345678" in the order of its characters, for which the CRC with this generator is known.
  const std::vector<std::uint32_t> words{0x31323334, 0x35363738};
  EXPECT_EQ(FWComputeCRC16(words.data(), words.size()), bitByBit(words));
  EXPECT_EQ(FWComputeCRC16(words.data(), words.size()), 0x9015);
}

TEST(ChecksumTest, AMessageThatEndsInItsOwnChecksumLeaves0) {
  const std::uint32_t word = 0xDEADBEEF;
  const std::uint32_t shifted[] = {word >> 16, (word << 16) | 0};
  const std::uint16_t crc = FWComputeCRC16(&word, 1);
  const std::uint32_t closed[] = {shifted[0], shifted[1] | crc};
  EXPECT_EQ(FWComputeCRC16(closed, 2), 0);
}

TEST(ChecksumTest, ItAgreesWithABitByBitRemainderOver10000RandomInputs) {
  std::mt19937 random(5);
  for (int i = 0; i < 10'000; ++i) {
    std::vector<std::uint32_t> words(random() % 40);
    for (auto& word : words) word = static_cast<std::uint32_t>(random());
    ASSERT_EQ(FWComputeCRC16(words.data(), words.size()), bitByBit(words)) << i;
  }
}

}  // namespace
}  // namespace brivo
