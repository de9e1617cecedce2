// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <cstdint>
#include <optional>

#include "imaging/picture.h"
#include "platform/decoding/image_decoder.h"
#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// Width and height in pixels.
struct Extent {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
};

/// The extent of an image that is fitted into a square of `maximum` pixels: never larger than it is, at least
/// one pixel each way, its own when `maximum` is 0.
Extent fitted(Extent image, std::uint32_t maximum);

// Each decoder reads the containers that its name says and gives the picture that `request` chooses: with
// every pixel of it, or scaled down as far as the codec does that by itself, but never below fitted().
// Orientation is not applied. None when the bytes are no such container, are broken, or are beyond the
// limits. Pure but for memory.

/// JPEG (ISO/IEC 10918-1), with JFIF, EXIF or Adobe markers; progressive, CMYK and YCCK too.
std::optional<Picture> decodeJpeg(const images::ByteSource& source, const ThumbnailRequest& request);
/// HEIF (ISO/IEC 23008-12): HEIC and AVIF, grids and thumbnail items.
std::optional<Picture> decodeHeif(const images::ByteSource& source, const ThumbnailRequest& request);
/// Camera raw files: an embedded preview that is large enough, else the developed sensor image.
std::optional<Picture> decodeRaw(const images::ByteSource& source, const ThumbnailRequest& request);
/// PNG, TIFF, WebP, GIF, BMP, JPEG 2000.
std::optional<Picture> decodeWithCodec(const images::ByteSource& source, const ThumbnailRequest& request);

/// Whatever container the bytes are.
std::optional<Picture> decodeImage(const images::ByteSource& source, const ThumbnailRequest& request);

}  // namespace brivo::imaging
