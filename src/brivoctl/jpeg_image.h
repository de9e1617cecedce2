// SPDX-License-Identifier: MIT
// Pictures in memory and as JPEG (ITU-T T.81).
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <vector>

#include "platform/base/data.h"

namespace brivoctl {

struct PictureSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;

  friend bool operator==(const PictureSize&, const PictureSize&) = default;
};

/// Pixels row by row without gaps, each 0xFFRRGGBB in the order of this machine.
struct Picture {
  PictureSize size;
  std::vector<std::uint32_t> pixels;
};

/// The longest side that a JPEG can have, in pixels, as the library counts.
inline constexpr std::uint32_t kLongestJpegSide = 65'500;

/// What the frame header of a JPEG says, in pixels; none when there is no such header.
std::optional<PictureSize> jpegSize(std::span<const std::byte> jpeg);

/// The picture, reduced in whole steps as long as its longest side stays at least `longestSide`. None when
/// the bytes are damaged, when they are of inks, and when the picture takes unreasonable memory or time.
std::optional<Picture> decodeJpeg(std::span<const std::byte> jpeg, std::uint32_t longestSide);

/// None when a side is 0 or longer than kLongestJpegSide.
std::optional<brivo::Data> encodeJpeg(const Picture& picture);

}  // namespace brivoctl
