// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <limits>

#include "platform/images/image_properties.h"
#include "platform/images/ranges.h"

namespace brivo::images {

/// What a parse is to find.
enum class Scope {
  basics,    ///< sizes, orientation, EXIF and TIFF entries, the EXIF thumbnail
  all,       ///< the same with GPS
  previews,  ///< sizes, orientation and every embedded JPEG
};

/// One parse of one file: where its bytes come from, what is looked for, what has been found, and what the
/// parse may still spend, so that it ends soon whatever the file says. *Thread-bound.*
class Parse {
 public:
  Parse(const ByteSource& source, Scope wanted) : ranges(source), scope(wanted) {}

  /// Takes one directory or segment from what may be looked at; false when nothing is left.
  bool spendDirectory() { return directoriesLeft_ != 0 && directoriesLeft_-- != 0; }
  /// Takes `count` entries or boxes, or as many as are left; how many that were.
  std::size_t spendEntries(std::uint64_t count) {
    const auto spent = static_cast<std::size_t>(std::min<std::uint64_t>(count, entriesLeft_));
    entriesLeft_ -= spent;
    return spent;
  }

  Ranges ranges;
  const Scope scope;
  ImageProperties found;

 private:
  std::size_t directoriesLeft_ = 512;
  std::size_t entriesLeft_ = 8192;
};

/// Sets `number` unless it is set.
template <class Number, class Other>
void setOnce(Number& number, Other value) {
  if (number == 0) number = static_cast<Number>(value);
}
inline void setOnce(PixelSize& size, PixelSize value) {
  if (!size) size = value;
}

/// Empty where a side is more than any image has.
constexpr PixelSize pixelSize(std::uint64_t width, std::uint64_t height) {
  constexpr std::uint64_t kMost = std::numeric_limits<std::uint32_t>::max();
  if (width > kMost || height > kMost) return {};
  return {static_cast<std::uint32_t>(width), static_cast<std::uint32_t>(height)};
}

/// True for the eight values that EXIF 2.32 defines (tag 0x0112).
constexpr bool isOrientation(std::uint64_t value) { return value >= 1 && value <= 8; }

}  // namespace brivo::images
