// SPDX-License-Identifier: MIT
#include "imaging/scaling.h"

#include <gtest/gtest.h>

#include <cstring>

#include "imaging/made_pictures.h"

namespace brivo::imaging {
namespace {

using test::madeFrame;

Frame filled(AVPixelFormat format, std::initializer_list<std::uint8_t> pixel, std::uint32_t width = 32) {
  Frame frame = makeFrame(format, width, width);
  for (int y = 0; y < frame->height; ++y) {
    std::uint8_t* at = frame->data[0] + static_cast<std::ptrdiff_t>(frame->linesize[0]) * y;
    for (int x = 0; x < frame->width; ++x) at = std::ranges::copy(pixel, at).out;
  }
  return frame;
}

TEST(FittedTest, TheLongerSideIsTheMaximumAndTheShorterInProportion) {
  const auto [width, height] = fitted({6000, 4000}, 160);
  EXPECT_EQ(width, 160u);
  EXPECT_EQ(height, 107u);
  EXPECT_EQ(fitted({3000, 6000}, 1024).width, 512u);
}

TEST(FittedTest, AnImageIsNeverMadeLargerAndNeverVanishes) {
  EXPECT_EQ(fitted({100, 50}, 160).width, 100u);
  EXPECT_EQ(fitted({100, 50}, 0).height, 50u) << "0 is the image's own size";
  EXPECT_EQ(fitted({30'000, 1}, 160).height, 1u);
}

TEST(ScalingTest, AFrameThatIsAsWantedIsGivenAsItIs) {
  Frame frame = madeFrame(64, 48);
  const AVFrame* same = frame.get();
  EXPECT_EQ(scaledForJpeg(std::move(frame), {64, 48}).get(), same);
}

TEST(ScalingTest, AScaledFrameLooksLikeTheOneItWasMadeOf) {
  const Frame scaled = scaledForJpeg(madeFrame(600, 400), {60, 40});
  ASSERT_TRUE(scaled);
  EXPECT_LT(test::meanDifference(*scaled, *madeFrame(60, 40)), 2.0);
}

TEST(ScalingTest, WhatShowsThroughIsWhite) {
  const Frame clear = scaledForJpeg(filled(AV_PIX_FMT_RGBA, {0, 0, 0, 0}), {16, 16});
  ASSERT_TRUE(clear);
  EXPECT_EQ(clear->data[0][0], 255);
  const Frame half = scaledForJpeg(filled(AV_PIX_FMT_RGBA, {0, 0, 0, 128}), {16, 16});
  EXPECT_NEAR(half->data[0][0], 127, 1);
}

TEST(ScalingTest, GreyStaysGreyAndSixteenBitsBecomeEight) {
  const Frame grey = scaledForJpeg(filled(AV_PIX_FMT_GRAY16LE, {0x00, 0x80}), {16, 16});
  ASSERT_TRUE(grey);
  EXPECT_EQ(grey->format, AV_PIX_FMT_GRAY8);
  EXPECT_NEAR(grey->data[0][0], 128, 1);
  const Frame deep = scaledForJpeg(filled(AV_PIX_FMT_RGB48LE, {0, 0xFF, 0, 0xFF, 0, 0xFF}), {16, 16});
  ASSERT_TRUE(deep);
  EXPECT_NEAR(deep->data[0][0], 255, 1);
}

TEST(ScalingTest, LimitedRangeBecomesFullRange) {
  Frame frame = madeFrame(32, 32);
  for (int y = 0; y < frame->height; ++y) std::memset(frame->data[0] + frame->linesize[0] * y, 235, 32);
  frame->color_range = AVCOL_RANGE_MPEG;
  const Frame full = scaledForJpeg(std::move(frame), {16, 16});
  ASSERT_TRUE(full);
  EXPECT_NEAR(full->data[0][0], 255, 1);
}

TEST(ScalingTest, LimitedRangeBecomesFullRangeAtTheSameSizeToo) {
  Frame frame = makeFrame(AV_PIX_FMT_YUV420P, 32, 32);
  for (std::size_t plane = 0; plane < 3; ++plane) {
    std::memset(frame->data[plane], plane == 0 ? 16 : 128,
                static_cast<std::size_t>(frame->linesize[plane]) * 16);
  }
  frame->color_range = AVCOL_RANGE_MPEG;
  const Frame full = scaledForJpeg(std::move(frame), {32, 32});
  ASSERT_TRUE(full);
  EXPECT_NEAR(full->data[0][0], 0, 1);
}

TEST(ScalingTest, UnpackedPixelsAreAlphaRedGreenBluePremultiplied) {
  const Frame pixels = unpacked(*filled(AV_PIX_FMT_RGBA, {200, 100, 50, 128}));
  ASSERT_TRUE(pixels);
  ASSERT_EQ(pixels->format, AV_PIX_FMT_ARGB);
  EXPECT_NEAR(pixels->data[0][0], 128, 1);
  EXPECT_NEAR(pixels->data[0][1], 100, 2);
  EXPECT_NEAR(pixels->data[0][2], 50, 2);
  EXPECT_NEAR(pixels->data[0][3], 25, 2);
}

TEST(LimitsTest, SizesBeyondTheLimitsGetNoMemory) {
  EXPECT_FALSE(isWithinLimits(65'535, 65'535));
  EXPECT_FALSE(isWithinLimits(0, 10));
  EXPECT_TRUE(isWithinLimits(30'000, 20'000));
  EXPECT_EQ(makeFrame(AV_PIX_FMT_GRAY8, 65'535, 65'535), nullptr);
}

}  // namespace
}  // namespace brivo::imaging
