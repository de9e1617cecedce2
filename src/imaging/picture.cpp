// SPDX-License-Identifier: MIT
#include "imaging/picture.h"

namespace brivo::imaging {

bool isWithinLimits(std::uint64_t width, std::uint64_t height) {
  return width > 0 && height > 0 && width <= kLongestSide && height <= kLongestSide &&
         width * height <= kMostPixels;
}

Frame makeFrame(int format, std::uint32_t width, std::uint32_t height) {
  if (!isWithinLimits(width, height)) return nullptr;
  Frame frame(av_frame_alloc());
  if (!frame) return nullptr;
  frame->format = format;
  frame->width = static_cast<int>(width);
  frame->height = static_cast<int>(height);
  return av_frame_get_buffer(frame.get(), 0) == 0 ? std::move(frame) : nullptr;
}

}  // namespace brivo::imaging
