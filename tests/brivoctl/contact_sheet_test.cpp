// SPDX-License-Identifier: MIT
#include "brivoctl/contact_sheet.h"

#include <gtest/gtest.h>

#include <algorithm>

#include "painted.h"

namespace brivoctl {
namespace {

using test::isBlueish;
using test::isReddish;
using test::kWhite;
using test::pixel;

constexpr std::uint32_t kTile = 64;

ContactSheet sheetOf(std::size_t tiles) { return ContactSheet(SheetLayout({{tiles}, false, kTile, 2})); }

/// Colours in a box.
std::vector<std::uint32_t> colours(const ContactSheet& sheet, const Box& box) {
  std::vector<std::uint32_t> found;
  for (std::uint64_t y = box.y; y < box.y + box.height; ++y) {
    for (std::uint64_t x = box.x; x < box.x + box.width; ++x) found.push_back(pixel(sheet.picture(), x, y));
  }
  return found;
}

bool isWhite(const ContactSheet& sheet, const Box& box) {
  return std::ranges::all_of(colours(sheet, box), [](std::uint32_t colour) { return colour == kWhite; });
}

/// No pixel outside the box has been drawn on.
bool isWhiteAround(const ContactSheet& sheet, const Box& box) {
  const Picture& picture = sheet.picture();
  for (std::uint64_t y = 0; y < picture.size.height; ++y) {
    for (std::uint64_t x = 0; x < picture.size.width; ++x) {
      const bool isInside = x >= box.x && x < box.x + box.width && y >= box.y && y < box.y + box.height;
      if (!isInside && pixel(picture, x, y) != kWhite) return false;
    }
  }
  return true;
}

/// Where a picture of this shape belongs in a tile.
Box placeIn(const Box& tile, std::uint64_t width, std::uint64_t height) {
  return {tile.x + (tile.width - width) / 2, tile.y + (tile.height - height) / 2, width, height};
}

/// Around all that is red or blue, and so no part of the sheet itself.
Box colouredBox(const ContactSheet& sheet) {
  const auto [width, height] = sheet.picture().size;
  std::uint64_t left = width, top = height, right = 0, bottom = 0;
  for (std::uint64_t y = 0; y < height; ++y) {
    for (std::uint64_t x = 0; x < width; ++x) {
      const std::uint32_t colour = pixel(sheet.picture(), x, y);
      if (!isReddish(colour) && !isBlueish(colour)) continue;
      left = std::min(left, x);
      right = std::max(right, x + 1);
      top = std::min(top, y);
      bottom = std::max(bottom, y + 1);
    }
  }
  return right == 0 ? Box() : Box{left, top, right - left, bottom - top};
}

struct Corner {
  unsigned orientation;
  bool isRight;
  bool isLow;
};

class Orientation : public testing::TestWithParam<Corner> {};

TEST_P(Orientation, PutsTheFirstCornerWhereExifSays) {
  const auto [orientation, isRight, isLow] = GetParam();
  const auto jpeg = encodeJpeg(test::marked({64, 32}, 16));
  ContactSheet sheet = sheetOf(1);
  ASSERT_TRUE(sheet.drawPicture(0, jpeg->bytes(), orientation));
  const bool isTurned = orientation >= 5;
  const Box box = placeIn(sheet.layout().tile(0), isTurned ? 32 : 64, isTurned ? 64 : 32);
  for (const bool right : {false, true}) {
    for (const bool low : {false, true}) {
      const std::uint32_t colour = pixel(sheet.picture(), right ? box.x + box.width - 6 : box.x + 5,
                                         low ? box.y + box.height - 6 : box.y + 5);
      const bool isMarked = right == isRight && low == isLow;
      EXPECT_TRUE(isMarked ? isReddish(colour) : isBlueish(colour)) << right << low << std::hex << colour;
    }
  }
  EXPECT_EQ(colouredBox(sheet), box);
  EXPECT_TRUE(isWhiteAround(sheet, sheet.layout().tile(0)));
}

INSTANTIATE_TEST_SUITE_P(Exif, Orientation,
                         testing::Values(Corner{1, false, false}, Corner{2, true, false},
                                         Corner{3, true, true}, Corner{4, false, true},
                                         Corner{5, false, false}, Corner{6, true, false},
                                         Corner{7, true, true}, Corner{8, false, true}),
                         [](const auto& corner) {
                           return "Orientation" + std::to_string(corner.param.orientation);
                         });

/// The corner alone cannot tell 5 from 1: the mark is a long one here.
TEST(ContactSheet, MirroredOrientationsAreNotThoseThatAreOnlyTurned) {
  Picture picture = test::painted({64, 32}, test::kBlue);  // red along the upper edge's left half
  for (std::size_t y = 0; y < 8; ++y)
    std::fill_n(picture.pixels.begin() + static_cast<long>(y * 64), 32, test::kRed);
  const auto jpeg = encodeJpeg(picture);
  const auto isRedAt = [&](unsigned orientation, std::uint64_t x, std::uint64_t y) {
    ContactSheet sheet = sheetOf(1);
    EXPECT_TRUE(sheet.drawPicture(0, jpeg->bytes(), orientation));
    const Box box = placeIn(sheet.layout().tile(0), 32, 64);
    return isReddish(pixel(sheet.picture(), box.x + x, box.y + y));
  };
  EXPECT_TRUE(isRedAt(5, 2, 24)) << "down the left edge, from the top";
  EXPECT_TRUE(isRedAt(6, 29, 24)) << "down the right edge, from the top";
  EXPECT_TRUE(isRedAt(7, 29, 40)) << "up the right edge, from the foot";
  EXPECT_TRUE(isRedAt(8, 2, 40)) << "up the left edge, from the foot";
}

TEST(ContactSheet, AnOrientationThatExifDoesNotKnowIsUpright) {
  const auto jpeg = encodeJpeg(test::marked({64, 32}, 16));
  ContactSheet sheet = sheetOf(1);
  ASSERT_TRUE(sheet.drawPicture(0, jpeg->bytes(), 1'000'000));
  const Box box = placeIn(sheet.layout().tile(0), 64, 32);
  EXPECT_TRUE(isReddish(pixel(sheet.picture(), box.x + 5, box.y + 5)));
}

TEST(ContactSheet, ALargePictureIsReducedToItsTileAndASmallOneIsNotEnlarged) {
  ContactSheet sheet = sheetOf(2);
  ASSERT_TRUE(sheet.drawPicture(0, encodeJpeg(test::painted({640, 320}, test::kRed))->bytes(), 1));
  EXPECT_EQ(colouredBox(sheet), placeIn(sheet.layout().tile(0), 64, 32));
  ContactSheet other = sheetOf(2);
  ASSERT_TRUE(other.drawPicture(1, encodeJpeg(test::painted({16, 16}, test::kRed))->bytes(), 1));
  EXPECT_EQ(colouredBox(other), placeIn(other.layout().tile(1), 16, 16));
}

TEST(ContactSheet, ANameIsWrittenBelowItsTileAlone) {
  ContactSheet sheet = sheetOf(2);
  sheet.drawCaption(0, "A.JPG");
  EXPECT_FALSE(isWhite(sheet, sheet.layout().caption(0)));
  EXPECT_TRUE(isWhiteAround(sheet, sheet.layout().caption(0)));
}

TEST(ContactSheet, ANameLongerThanTheTileLosesItsMiddleAndStaysWithinIt) {
  ContactSheet sheet = sheetOf(2);
  sheet.drawCaption(0, "AAAA" + std::string(200, '.') + "BBBB");
  sheet.drawCaption(1, "AAAA" + std::string(300, '.') + "BBBB");
  const SheetLayout& layout = sheet.layout();
  EXPECT_FALSE(isWhite(sheet, layout.caption(0)));
  EXPECT_EQ(colours(sheet, layout.caption(0)), colours(sheet, layout.caption(1)));
  const Box first = layout.caption(0);
  const Box last = layout.caption(1);
  EXPECT_TRUE(isWhite(sheet, {first.x + first.width, first.y, last.x - first.x - first.width, first.height}));

  ContactSheet otherEnd = sheetOf(1);
  otherEnd.drawCaption(0, "AAAA" + std::string(200, '.') + "WWWW");
  EXPECT_NE(colours(otherEnd, otherEnd.layout().caption(0)), colours(sheet, first)) << "the end is shown";
}

TEST(ContactSheet, AHeadingIsWrittenInItsPlace) {
  ContactSheet sheet(SheetLayout({{1, 1}, true, kTile, 2}));
  sheet.drawHeading(1, "DCIM/101ABCDE");
  EXPECT_FALSE(isWhite(sheet, sheet.layout().heading(1)));
  EXPECT_TRUE(isWhiteAround(sheet, sheet.layout().heading(1)));
}

TEST(ContactSheet, DamagedBytesLeaveTheTileForSomethingNeutral) {
  const auto whole = encodeJpeg(test::marked({160, 120}, 60));
  ContactSheet sheet = sheetOf(2);
  EXPECT_FALSE(sheet.drawPicture(0, whole->bytes().first(whole->size() / 2), 1));
  EXPECT_FALSE(sheet.drawPicture(0, {}, 1));
  EXPECT_TRUE(isWhiteAround(sheet, {}));
  sheet.drawNeutral(0, "damaged");
  const auto drawn = colours(sheet, sheet.layout().tile(0));
  EXPECT_TRUE(std::ranges::all_of(drawn, [](std::uint32_t colour) {  // grey
    return (colour & 0xFF) == (colour >> 8 & 0xFF) && (colour & 0xFF) == (colour >> 16 & 0xFF);
  }));
  EXPECT_TRUE(isWhiteAround(sheet, sheet.layout().tile(0)));

  ContactSheet other = sheetOf(2);
  other.drawNeutral(0, "no thumbnail");
  EXPECT_NE(colours(other, other.layout().tile(0)), drawn) << "it says what is wrong";
}

TEST(ContactSheet, BothFormatsHaveTheSizeOfTheLayout) {
  ContactSheet sheet = sheetOf(3);
  const PictureSize size{static_cast<std::uint32_t>(sheet.layout().width()),
                         static_cast<std::uint32_t>(sheet.layout().height())};
  EXPECT_EQ(jpegSize(sheet.encode(SheetFormat::jpeg)->bytes()), size);
  const auto png = sheet.encode(SheetFormat::png);
  const std::string_view text = png->text();
  ASSERT_GT(text.size(), 24U);
  EXPECT_EQ(text.substr(1, 3), "PNG");
  const auto integerAt = [&](std::size_t offset) {
    std::uint32_t value = 0;
    for (const char byte : text.substr(offset, 4)) value = value << 8 | static_cast<unsigned char>(byte);
    return value;
  };
  EXPECT_EQ((PictureSize{integerAt(16), integerAt(20)}), size);
}

TEST(ContactSheet, ASheetAsTallAsAJpegCanBeIsDrawnToItsFoot) {
  std::size_t tiles = 1000;
  while (SheetLayout({{tiles + 1}, false, 16, 1}).height() <= kLongestJpegSide) ++tiles;
  SheetLayout layout({{tiles}, false, 16, 1});
  EXPECT_EQ(ContactSheet::obstacle(layout, SheetFormat::png), SheetObstacle::tooTall);
  ASSERT_EQ(ContactSheet::obstacle(layout, SheetFormat::jpeg), SheetObstacle::none);
  ContactSheet sheet(std::move(layout));
  ASSERT_TRUE(sheet.drawPicture(tiles - 1, encodeJpeg(test::painted({16, 16}, test::kRed))->bytes(), 1));
  const Box& last = sheet.layout().tile(tiles - 1);
  EXPECT_TRUE(isReddish(pixel(sheet.picture(), last.x + 8, last.y + 8)));
  EXPECT_TRUE(sheet.encode(SheetFormat::jpeg));
}

TEST(ContactSheet, ASheetThatNoFileHoldsHasAnObstacle) {
  const auto obstacle = [](std::size_t tiles, std::uint32_t size, std::size_t columns) {
    return ContactSheet::obstacle(SheetLayout({{tiles}, false, size, columns}), SheetFormat::jpeg);
  };
  EXPECT_EQ(obstacle(100, 160, 10), SheetObstacle::none);
  EXPECT_EQ(obstacle(1, 160, 1000), SheetObstacle::tooWide);
  EXPECT_EQ(obstacle(1000, 160, 1), SheetObstacle::tooTall);
  EXPECT_EQ(obstacle(1000, 1000, 30), SheetObstacle::tooManyPixels);
}

}  // namespace
}  // namespace brivoctl
