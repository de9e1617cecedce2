// SPDX-License-Identifier: MIT
// Pictures that tests paint.
#pragma once

#include "brivoctl/jpeg_image.h"

namespace brivoctl::test {

inline constexpr std::uint32_t kBlue = 0xFF0000FF;
inline constexpr std::uint32_t kRed = 0xFFFF0000;
inline constexpr std::uint32_t kWhite = 0xFFFFFFFF;

inline Picture painted(PictureSize size, std::uint32_t colour) {
  return {size, std::vector<std::uint32_t>(std::size_t{size.width} * size.height, colour)};
}

/// Blue, with a red square of `side` pixels in the upper left corner.
inline Picture marked(PictureSize size, std::uint32_t side) {
  Picture picture = painted(size, kBlue);
  for (std::uint32_t y = 0; y < side; ++y) {
    for (std::uint32_t x = 0; x < side; ++x) picture.pixels[std::size_t{y} * size.width + x] = kRed;
  }
  return picture;
}

inline std::uint32_t pixel(const Picture& picture, std::uint64_t x, std::uint64_t y) {
  return picture.pixels.at(y * picture.size.width + x);
}

/// As JPEG leaves them.
inline bool isReddish(std::uint32_t colour) { return (colour >> 16 & 0xFF) > 180 && (colour & 0xFF) < 70; }
inline bool isBlueish(std::uint32_t colour) { return (colour & 0xFF) > 180 && (colour >> 16 & 0xFF) < 70; }

}  // namespace brivoctl::test
