// SPDX-License-Identifier: MIT
// What holds of whatever a decoder makes of a file.
#pragma once

#include <span>

#include "check.h"
#include "imaging/decode_request.h"
#include "imaging/jpeg_encoder.h"
#include "imaging/scaling.h"
#include "platform/images/image_reader.h"

namespace brivo::imaging {

using Decode = std::optional<Picture>(const images::ByteSource&, const ThumbnailRequest&);

/// Large pictures take time and memory, and nothing new is learned from them.
inline bool claimsFewPixels(const images::ByteSource& source) {
  constexpr std::uint64_t kFew = 1 << 20;
  const auto properties = images::copyImageProperties(source);
  return !properties || std::uint64_t{properties->size.width} * properties->size.height <= kFew;
}

inline void checkPicture(Picture picture, std::uint32_t maximum) {
  const auto side = [](int pixels) { return static_cast<std::uint32_t>(pixels); };
  check(picture.frame != nullptr);
  const Extent image{side(picture.frame->width), side(picture.frame->height)};
  check(isWithinLimits(image.width, image.height));
  const Extent size = fitted(image, maximum);
  picture.frame = scaledForJpeg(std::move(picture.frame), size);
  if (!picture.frame) return;  // a pixel format that cannot be scaled
  check(side(picture.frame->width) == size.width && side(picture.frame->height) == size.height);
  check(encodeJpeg(picture).size() > 2);
}

/// Has `decode` make thumbnails of a fuzz input.
inline void checkDecoder(Decode decode, const std::uint8_t* data, std::size_t size) {
  const images::MemorySource source(std::as_bytes(std::span(data, size)));
  if (!claimsFewPixels(source)) return;
  for (const auto from :
       {ThumbnailSource::full, ThumbnailSource::embeddedElseFull, ThumbnailSource::embedded}) {
    constexpr std::uint32_t kMaximum = 64;
    if (auto picture = decode(source, {kMaximum, from, kMaximum}))
      checkPicture(*std::move(picture), kMaximum);
  }
}

}  // namespace brivo::imaging
