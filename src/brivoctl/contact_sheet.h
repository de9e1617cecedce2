// SPDX-License-Identifier: MIT
// Draws contact sheets.
#pragma once

#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "brivoctl/jpeg_image.h"
#include "brivoctl/sheet_layout.h"

namespace brivoctl {

/// The kinds of file that a sheet can become.
enum class SheetFormat { jpeg, png };

/// Why a sheet cannot be made.
enum class SheetObstacle { none, tooWide, tooTall, tooManyPixels };

/// A white sheet with pictures that come one by one, in any order. Texts are UTF-8 of one line; one that has
/// not enough room loses its middle. *Thread-bound.*
class ContactSheet {
 public:
  static constexpr std::uint64_t kMostPixels = 200'000'000;

  /// The longest side that a file of this kind can have, in pixels.
  static std::uint64_t longestSide(SheetFormat format);
  static SheetObstacle obstacle(const SheetLayout& layout, SheetFormat format);

  /// A layout without obstacle. Takes memory for every pixel.
  explicit ContactSheet(SheetLayout layout);
  ~ContactSheet();

  void drawHeading(std::size_t section, const std::string& text);
  void drawCaption(std::size_t index, const std::string& text);
  /// Puts a picture into a tile, reduced when it is larger; `orientation` is EXIF's, and what EXIF does not
  /// know counts as upright. False, with the tile unchanged, when the bytes are damaged.
  bool drawPicture(std::size_t index, std::span<const std::byte> jpeg, std::uint64_t orientation);
  /// A tile that shows `text` in place of a picture.
  void drawNeutral(std::size_t index, const std::string& text);

  const SheetLayout& layout() const { return layout_; }
  const Picture& picture() const { return sheet_; }
  /// The file's bytes; none when there is not enough memory.
  std::optional<brivo::Data> encode(SheetFormat format) const;

 private:
  class Canvas;
  class Fonts;

  Canvas canvasOn(const Box& box);

  const SheetLayout layout_;
  const std::unique_ptr<Fonts> fonts_;
  Picture sheet_;
};

}  // namespace brivoctl
