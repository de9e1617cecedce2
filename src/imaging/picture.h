// SPDX-License-Identifier: MIT
#pragma once

extern "C" {
#include <libavutil/frame.h>
}

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace brivo::imaging {

struct FreeFrame {
  void operator()(AVFrame* frame) const { av_frame_free(&frame); }
};
/// Decoded pixels: size, pixel format, colour matrix and range are the frame's.
using Frame = std::unique_ptr<AVFrame, FreeFrame>;

/// Pixels and what they mean.
struct Picture {
  Frame frame;                        ///< never null, and within the limits below
  std::vector<std::byte> iccProfile;  ///< of the pixels (ISO 15076-1); empty for sRGB
};

/// Most pixels that an image may claim; what claims more is not decoded.
inline constexpr std::uint64_t kMostPixels = std::uint64_t{1} << 30;
/// Longest side that JPEG libraries write (JPEG_MAX_DIMENSION of libjpeg).
inline constexpr std::uint32_t kLongestSide = 65'500;
bool isWithinLimits(std::uint64_t width, std::uint64_t height);

/// An empty frame of this size and format (AVPixelFormat), with memory; null when it is beyond the limits or
/// memory runs out.
Frame makeFrame(int format, std::uint32_t width, std::uint32_t height);

}  // namespace brivo::imaging
