// SPDX-License-Identifier: MIT
// Thumbnails of single files, and images turned upright. *Thread-safe.*
#pragma once

#include <optional>
#include <string>

#include "platform/base/url.h"
#include "platform/decoding/image_decoder.h"

namespace brivo {

/// A JPEG of the first image of a file, its longer side at most `maximumPixelSize` pixels: made of a
/// thumbnail that the file holds, or else of the image. None without a URL, and when there is nothing that
/// can be decoded.
std::optional<Data> OVCreateJPEGThumbnailDataFromURL(ImageDecoder& decoder, const Url* url,
                                                     std::int32_t maximumPixelSize);

/// Of the images of an icon file the first that is at most `size` pixels wide, or else its first one. None
/// without a path, and when no image tells its width.
std::optional<Image> OVCreateThumbnailFromIconFile(ImageDecoder& decoder, const std::string* path,
                                                   std::uint32_t size);

/// The image as it is to be seen, when `orientation` is what EXIF says of it (CIPA DC-008, tag 274); outside
/// 1 to 8 it is as it is. The image itself when there is no memory.
std::optional<Image> OVCreateRotatedImage(std::int32_t orientation, const std::optional<Image>& image);

}  // namespace brivo
