// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::integer;

std::string gif(std::string_view version, std::uint32_t width, std::uint32_t height) {
  return "GIF" + std::string(version) + integer(width, 2) + integer(height, 2) + std::string("\xF7\0\0", 3);
}

std::string bmp(std::uint32_t width, std::uint32_t height, unsigned bits, std::uint32_t header = 40) {
  const std::size_t bytes = header == 12 ? 2 : 4;
  std::string file = "BM" + integer(0, 12) + integer(header, 4) + integer(width, bytes) +
                     integer(height, bytes) + integer(1, 2) + integer(bits, 2);
  file.resize(14 + header);
  return file;
}

TEST(Gif, SizeIsThatOfTheLogicalScreen) {
  for (const char* const version : {"87a", "89a"}) {
    const auto found = readBasics(gif(version, 640, 480));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{640, 480}));
    EXPECT_EQ(found->depth, 8);
  }
}

TEST(Gif, AnEmptyScreenIsNoPicture) {
  EXPECT_FALSE(*readBasics(gif("89a", 0, 480)));
  EXPECT_FALSE(readBasics(gif("90a", 640, 480)));
}

TEST(Bmp, SizeIsReadFromEveryHeader) {
  for (const std::uint32_t header : {12u, 16u, 40u, 64u, 108u, 124u}) {
    const auto found = readBasics(bmp(640, 480, 24, header));
    ASSERT_TRUE(found) << header;
    EXPECT_EQ(found->size, (PixelSize{640, 480})) << header;
    EXPECT_EQ(found->depth, 8) << header;
  }
}

TEST(Bmp, LinesFromTheTopCountLikeLinesFromTheBottom) {
  EXPECT_EQ(readBasics(bmp(640, 0U - 480, 24))->size, (PixelSize{640, 480}));
  EXPECT_EQ(readBasics(bmp(640, 0x80000000, 24))->size, (PixelSize{640, 0x80000000}));
}

TEST(Bmp, FewBitsPerPixelAreTheDepth) {
  EXPECT_EQ(readBasics(bmp(640, 480, 1))->depth, 1);
  EXPECT_EQ(readBasics(bmp(640, 480, 4))->depth, 4);
  EXPECT_EQ(readBasics(bmp(640, 480, 8))->depth, 8);
  EXPECT_EQ(readBasics(bmp(640, 480, 32))->depth, 8);
}

TEST(Bmp, WhatOnlyBeginsLikeABmpIsNone) {
  EXPECT_FALSE(readBasics("BM is how this text begins, and it is no picture at all."));
  EXPECT_FALSE(readBasics(bmp(640, 480, 24, 11)));
  EXPECT_FALSE(*readBasics(bmp(0x80000000, 480, 24)));
  EXPECT_FALSE(*readBasics(bmp(640, 480, 0)));
  EXPECT_FALSE(*readBasics(bmp(0, 0, 24)));
}

TEST(SmallImages, DamagedFilesAreReadSoundly) {
  for (const std::string& file : {gif("89a", 640, 480), bmp(640, 480, 24), bmp(640, 480, 4, 12)}) {
    expectCutsSound(file);
    expectHugeNumbersSound(file);
  }
}

TEST(SmallImages, AHeaderThatIsCutGivesNoSize) {
  EXPECT_FALSE(*readBasics(gif("89a", 640, 480).substr(0, 9)));
  EXPECT_FALSE(*readBasics(bmp(640, 480, 24).substr(0, 29)));
  EXPECT_FALSE(*readBasics(bmp(640, 480, 24, 12).substr(0, 25)));
}

}  // namespace
}  // namespace brivo::images
