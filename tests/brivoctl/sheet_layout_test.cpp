// SPDX-License-Identifier: MIT
#include "brivoctl/sheet_layout.h"

#include <gtest/gtest.h>

#include <array>

namespace brivoctl {
namespace {

bool areApart(const Box& a, const Box& b) {
  return a.x + a.width <= b.x || b.x + b.width <= a.x || a.y + a.height <= b.y || b.y + b.height <= a.y;
}

TEST(SheetLayout, TilesFillRowsFromTheLeft) {
  const SheetLayout layout({{7}, false, 160, 3});
  EXPECT_EQ(layout.columns(), 3U);
  EXPECT_EQ(layout.rows(), 3U);
  EXPECT_EQ(layout.tiles(), 7U);
  EXPECT_EQ(layout.tile(1).y, layout.tile(0).y);
  EXPECT_GT(layout.tile(1).x, layout.tile(0).x);
  EXPECT_EQ(layout.tile(3).x, layout.tile(0).x);
  EXPECT_GT(layout.tile(3).y, layout.tile(0).y);
  EXPECT_EQ(layout.tile(6).x, layout.tile(0).x);
}

TEST(SheetLayout, TheMarginIsTheSameOnEverySide) {
  const SheetLayout layout({{6}, false, 160, 3});
  const std::uint64_t margin = layout.tile(0).x;
  EXPECT_EQ(layout.tile(0).y, margin);
  EXPECT_EQ(layout.tile(2).x + layout.tile(2).width + margin, layout.width());
  EXPECT_EQ(layout.caption(5).y + layout.caption(5).height + margin, layout.height());
}

TEST(SheetLayout, ASectionBeginsARowAndAHeadingGoesAboveIt) {
  const SheetLayout layout({{4, 1, 3}, true, 160, 3});
  EXPECT_EQ(layout.rows(), 4U);
  EXPECT_EQ(layout.tile(4).x, layout.tile(0).x);
  EXPECT_EQ(layout.tile(5).x, layout.tile(0).x);
  EXPECT_LE(layout.heading(0).y + layout.heading(0).height, layout.tile(0).y);
  EXPECT_LE(layout.caption(3).y + layout.caption(3).height, layout.heading(1).y);
  EXPECT_LE(layout.heading(1).y + layout.heading(1).height, layout.tile(4).y);
}

TEST(SheetLayout, NothingLiesOverAnythingElseOrOutside) {
  for (const std::uint32_t size : {16U, 160U, 1000U}) {
    const SheetLayout layout({{4, 1}, true, size, 3});
    std::vector<Box> boxes{layout.heading(0), layout.heading(1)};
    for (std::size_t index = 0; index < layout.tiles(); ++index) {
      boxes.push_back(layout.tile(index));
      boxes.push_back(layout.caption(index));
    }
    for (std::size_t a = 0; a < boxes.size(); ++a) {
      EXPECT_LE(boxes[a].x + boxes[a].width, layout.width());
      EXPECT_LE(boxes[a].y + boxes[a].height, layout.height());
      for (std::size_t b = a + 1; b < boxes.size(); ++b) EXPECT_TRUE(areApart(boxes[a], boxes[b])) << a << b;
    }
  }
}

TEST(SheetLayout, TheColumnsMakeAShapeLikePaperOnItsSide) {
  for (const std::size_t count : {12U, 30U, 60U, 100U}) {
    SheetLayout::Options options{{count}, false, 160, 1};
    options.columns = SheetLayout::columnsFor(options);
    const SheetLayout layout(options);
    const double shape = static_cast<double>(layout.width()) / static_cast<double>(layout.height());
    EXPECT_GT(shape, 1.1) << count;
    EXPECT_LT(shape, 1.7) << count;
  }
}

TEST(SheetLayout, ThereAreNeverMoreColumnsThanTilesSideBySideAndNeverMoreThanTwelve) {
  EXPECT_EQ(SheetLayout::columnsFor({{1}, false, 160, 1}), 1U);
  EXPECT_EQ(SheetLayout::columnsFor({{2, 1, 2, 1, 2, 1, 2, 1}, true, 160, 1}), 2U);
  EXPECT_EQ(SheetLayout::columnsFor({{1000}, false, 160, 1}), SheetLayout::kMostColumns);
}

}  // namespace
}  // namespace brivoctl
