// SPDX-License-Identifier: MIT
#include "brivoctl/jpeg_image.h"

#include <gtest/gtest.h>

#include "painted.h"
#include "support/image_bytes.h"

namespace brivoctl {
namespace {

using test::marked;
using test::painted;
using test::pixel;

std::span<const std::byte> bytesOf(const std::string& text) { return std::as_bytes(std::span(text)); }

TEST(JpegImage, APictureComesBackAsItWas) {
  const auto jpeg = encodeJpeg(marked({64, 48}, 16));
  ASSERT_TRUE(jpeg);
  const auto picture = decodeJpeg(jpeg->bytes(), 64);
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->size, (PictureSize{64, 48}));
  EXPECT_TRUE(test::isReddish(pixel(*picture, 4, 4)));
  EXPECT_TRUE(test::isBlueish(pixel(*picture, 60, 4)));
  EXPECT_TRUE(test::isBlueish(pixel(*picture, 4, 44)));
}

TEST(JpegImage, ALargePictureIsReducedNoFurtherThanWanted) {
  const auto jpeg = encodeJpeg(painted({1600, 400}, test::kBlue));
  EXPECT_EQ(decodeJpeg(jpeg->bytes(), 160)->size, (PictureSize{200, 50}));
  EXPECT_EQ(decodeJpeg(jpeg->bytes(), 201)->size, (PictureSize{400, 100}));
  EXPECT_EQ(decodeJpeg(jpeg->bytes(), 5000)->size, (PictureSize{1600, 400}));
}

TEST(JpegImage, TheFrameHeaderTellsTheSize) {
  EXPECT_EQ(jpegSize(encodeJpeg(painted({30, 20}, test::kBlue))->bytes()), (PictureSize{30, 20}));
  const std::string behindOthers =
      brivo::test::jpeg(4000, 3000, brivo::test::jpegSegment(0xE1, "Exif") + std::string(9, '\xFF'));
  EXPECT_EQ(jpegSize(bytesOf(behindOthers)), (PictureSize{4000, 3000}));
}

TEST(JpegImage, WithoutAFrameHeaderThereIsNoSize) {
  const std::string whole = brivo::test::jpeg(4000, 3000, brivo::test::jpegSegment(0xE1, "Exif"));
  const std::size_t frame = whole.find(brivo::test::jpegFrame(4000, 3000));
  for (std::size_t length = 0; length < frame + 9; ++length)
    EXPECT_FALSE(jpegSize(bytesOf(whole.substr(0, length)))) << length;
  EXPECT_TRUE(jpegSize(bytesOf(whole.substr(0, frame + 9))));
  for (const std::string bad :
       {"\xFF\xD8\xFF\xD9", "no picture", "\xFF\xD8\xFF\xDA\x01\x01", "\xFF\xD8\xFF\xE0"})
    EXPECT_FALSE(jpegSize(bytesOf(bad)));
  EXPECT_FALSE(jpegSize(bytesOf(std::string("\xFF\xD8\xFF\xE0\0\0\xFF\xC0", 8)))) << "a length that is none";
}

TEST(JpegImage, DamagedBytesAreNoPicture) {
  const auto whole = encodeJpeg(marked({256, 256}, 100));
  const std::span<const std::byte> bytes = whole->bytes();
  for (const std::size_t length : {std::size_t{0}, std::size_t{1}, std::size_t{20}, bytes.size() / 2})
    EXPECT_FALSE(decodeJpeg(bytes.first(length), 256)) << length;
  EXPECT_FALSE(decodeJpeg(bytesOf("what is no picture"), 256));
  EXPECT_FALSE(decodeJpeg(bytesOf(brivo::test::jpeg(160, 120)), 256)) << "headers alone";
}

TEST(JpegImage, AMissingEndMarkerIsNoDamage) {
  const auto whole = encodeJpeg(marked({64, 48}, 16));
  EXPECT_TRUE(decodeJpeg(whole->bytes().first(whole->size() - 2), 64));
}

TEST(JpegImage, AHugeClaimTakesNoMemory) {
  const std::string claim = brivo::test::jpeg(65'000, 65'000);
  EXPECT_FALSE(decodeJpeg(bytesOf(claim), 160));
}

TEST(JpegImage, WhatJpegCannotHoldIsNotWritten) {
  EXPECT_FALSE(encodeJpeg(Picture()));
  EXPECT_FALSE(encodeJpeg(painted({kLongestJpegSide + 1, 1}, test::kBlue)));
  EXPECT_TRUE(encodeJpeg(painted({kLongestJpegSide, 1}, test::kBlue)));
}

}  // namespace
}  // namespace brivoctl
