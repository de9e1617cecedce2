// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace brivoctl {

/// A rectangle in pixels, from the upper left corner of a sheet.
struct Box {
  std::uint64_t x = 0;
  std::uint64_t y = 0;
  std::uint64_t width = 0;
  std::uint64_t height = 0;

  friend bool operator==(const Box&, const Box&) = default;
};

/// Where everything is on a contact sheet: sections one below the other, each perhaps under a heading, with
/// tiles in rows from the left to the right and a caption below each. *Immutable.*
class SheetLayout {
 public:
  static constexpr std::size_t kMostColumns = 12;

  struct Options {
    std::vector<std::size_t> sections;  ///< how many tiles each has
    bool headings = false;
    std::uint32_t tile = 160;  ///< longest side of a picture, in pixels
    std::size_t columns = 1;   ///< at least 1
  };
  explicit SheetLayout(Options options);

  /// The number of columns, at most kMostColumns, with which a sheet comes closest to what fills a screen or
  /// a sheet of paper on its side. `options.columns` means nothing.
  static std::size_t columnsFor(Options options);

  std::size_t columns() const { return options_.columns; }
  std::size_t rows() const { return rows_; }  ///< of tiles
  bool hasHeadings() const { return options_.headings; }
  std::size_t tiles() const { return tiles_.size(); }
  std::uint64_t width() const;
  std::uint64_t height() const { return height_; }

  /// Counted over all sections.
  const Box& tile(std::size_t index) const { return tiles_[index]; }
  Box caption(std::size_t index) const;
  /// Only with headings.
  const Box& heading(std::size_t section) const { return headings_[section]; }

  /// Sizes of letters, in pixels.
  std::uint32_t captionLetters() const;
  std::uint32_t headingLetters() const;

 private:
  std::uint64_t gap() const { return options_.tile / 8 + 4; }
  std::uint64_t margin() const { return options_.tile / 5 + 8; }
  std::uint64_t captionGap() const { return options_.tile / 40 + 2; }
  std::uint64_t captionHeight() const { return std::uint64_t{captionLetters()} * 3 / 2; }
  std::uint64_t headingHeight() const { return std::uint64_t{headingLetters()} * 2; }
  std::uint64_t addHeading(std::uint64_t y);
  std::uint64_t addTiles(std::size_t count, std::uint64_t y);

  const Options options_;
  std::vector<Box> tiles_;
  std::vector<Box> headings_;
  std::size_t rows_ = 0;
  std::uint64_t height_ = 0;
};

}  // namespace brivoctl
