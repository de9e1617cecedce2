// SPDX-License-Identifier: MIT
#include "brivoctl/jpeg_image.h"

#include <algorithm>

#include "check.h"

// A picture has all its pixels, and as many as were wanted when the file has them.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr std::uint32_t kWanted = 16;
  const auto bytes = std::as_bytes(std::span(data, size));
  const auto stated = brivoctl::jpegSize(bytes);
  const auto picture = brivoctl::decodeJpeg(bytes, kWanted);
  if (!picture) return 0;
  const auto [width, height] = picture->size;
  check(picture->pixels.size() == std::size_t{width} * height);
  if (stated) check(std::max(width, height) >= std::min(kWanted, std::max(stated->width, stated->height)));
  return 0;
}
