// SPDX-License-Identifier: MIT
#include "brivoctl/sheet_layout.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace brivoctl {

namespace {

/// Width to height: between a screen of 4:3 and a sheet of A4.
constexpr double kBestShape = 1.375;

}  // namespace

SheetLayout::SheetLayout(Options options) : options_(std::move(options)) {
  std::uint64_t y = margin();
  for (const std::size_t count : options_.sections) {
    if (options_.headings) y = addHeading(y);
    y = addTiles(count, y);
  }
  height_ = y - (options_.sections.empty() ? 0 : gap()) + margin();
}

std::uint64_t SheetLayout::addHeading(std::uint64_t y) {
  headings_.push_back({margin(), y, width() - 2 * margin(), headingHeight()});
  return y + headingHeight();
}

/// The place below them.
std::uint64_t SheetLayout::addTiles(std::size_t count, std::uint64_t y) {
  const std::uint64_t below = options_.tile + captionGap() + captionHeight() + gap();
  for (std::size_t index = 0; index < count; ++index) {
    const std::uint64_t column = index % columns();
    const std::uint64_t row = index / columns();
    tiles_.push_back(
        {margin() + column * (options_.tile + gap()), y + row * below, options_.tile, options_.tile});
  }
  const std::size_t rows = (count + columns() - 1) / columns();
  rows_ += rows;
  return y + rows * below;
}

std::uint64_t SheetLayout::width() const {
  return 2 * margin() + columns() * (options_.tile + gap()) - gap();
}

Box SheetLayout::caption(std::size_t index) const {
  const Box& box = tile(index);
  return {box.x, box.y + box.height + captionGap(), box.width, captionHeight()};
}

std::uint32_t SheetLayout::captionLetters() const { return std::clamp(options_.tile / 14, 8U, 28U); }

std::uint32_t SheetLayout::headingLetters() const { return std::clamp(options_.tile / 10, 10U, 40U); }

std::size_t SheetLayout::columnsFor(Options options) {
  const auto distance = [&](std::size_t columns) {
    options.columns = columns;
    const SheetLayout layout(options);
    const double shape = static_cast<double>(layout.width()) / static_cast<double>(layout.height());
    return std::abs(std::log(shape / kBestShape));
  };
  const std::size_t longest =
      options.sections.empty() ? 1 : std::max<std::size_t>(1, std::ranges::max(options.sections));
  std::vector<std::size_t> candidates(std::min(kMostColumns, longest));
  std::iota(candidates.begin(), candidates.end(), 1);
  return std::ranges::min(candidates, {}, distance);
}

}  // namespace brivoctl
