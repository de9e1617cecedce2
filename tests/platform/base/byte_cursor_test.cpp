// SPDX-License-Identifier: MIT
#include "platform/base/byte_cursor.h"

#include <gtest/gtest.h>

#include <array>

namespace brivo {
namespace {

constexpr std::array<std::byte, 8> kBytes{std::byte{1}, std::byte{2}, std::byte{3}, std::byte{4},
                                          std::byte{5}, std::byte{6}, std::byte{7}, std::byte{8}};

TEST(ByteCursorTest, ReadsLittleEndianByDefault) {
  ByteCursor cursor(kBytes);
  EXPECT_EQ(cursor.u8(), 0x01);
  EXPECT_EQ(cursor.u16(), 0x0302);
  EXPECT_EQ(cursor.u32(), 0x07060504u);
  EXPECT_EQ(cursor.remaining(), 1u);
  EXPECT_TRUE(cursor.ok());
}

TEST(ByteCursorTest, ReadsBigEndianWhenTold) {
  ByteCursor cursor(kBytes, std::endian::big);
  EXPECT_EQ(cursor.u64(), 0x0102030405060708u);
  cursor.seek(0);
  cursor.setOrder(std::endian::little);
  EXPECT_EQ(cursor.u64(), 0x0807060504030201u);
  EXPECT_TRUE(cursor.ok());
}

TEST(ByteCursorTest, AnOverrunGivesZeroAndIsRemembered) {
  ByteCursor cursor(kBytes);
  cursor.skip(6);
  EXPECT_EQ(cursor.u32(), 0u);
  EXPECT_FALSE(cursor.ok());
  cursor.seek(0);
  EXPECT_EQ(cursor.u8(), 1);
  EXPECT_FALSE(cursor.ok()) << "an overrun must not be forgotten";
}

TEST(ByteCursorTest, AHugeCountDoesNotWrapAround) {
  ByteCursor cursor(kBytes);
  cursor.skip(4);
  EXPECT_TRUE(cursor.take(SIZE_MAX - 1).empty());
  EXPECT_FALSE(cursor.ok());
}

TEST(ByteCursorTest, TheEndIsAPositionButNotBeyond) {
  ByteCursor cursor(kBytes);
  cursor.seek(8);
  EXPECT_TRUE(cursor.ok());
  EXPECT_TRUE(cursor.take(0).empty());
  EXPECT_TRUE(cursor.ok());
  cursor.seek(9);
  EXPECT_FALSE(cursor.ok());
}

}  // namespace
}  // namespace brivo
