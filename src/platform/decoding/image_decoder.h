// SPDX-License-Identifier: MIT
// Decoding of still images. Who decodes, and in which process, is not the caller's matter.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "platform/base/data.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// What a thumbnail is made of.
enum class ThumbnailSource : std::uint8_t {
  embedded,          ///< a thumbnail that the file holds, or nothing
  embeddedElseFull,  ///< the image itself where the file holds none
  full,              ///< always the image itself
};

struct ThumbnailRequest {
  /// Longest side of the thumbnail in pixels; a smaller image keeps its size. 0: the image's own size.
  std::uint32_t maximumPixelSize = 0;
  ThumbnailSource source = ThumbnailSource::full;
  /// Of several images in the file, the first that is taller than this many pixels, else the first; none: the
  /// first.
  std::optional<std::uint32_t> imageTallerThan = std::nullopt;
};

/// A decoded image, its rows from top to bottom without padding. *Immutable.*
struct Image {
  std::uint32_t width = 0;  ///< pixels, as is the next
  std::uint32_t height = 0;
  /// 1: a byte of grey; 4: alpha, red, green, blue, premultiplied with alpha.
  std::uint32_t bytesPerPixel = 4;
  Data pixels;
};

/// Every function reads `file` from its start, whatever the file's position is, and takes a bounded time. An
/// image that cannot be decoded yields nothing. No orientation is applied. *Thread-safe.*
class ImageDecoder {
 public:
  virtual ~ImageDecoder() = default;

  /// A JPEG of the image that `request` chooses, 8 bits a sample, with the image's ICC profile.
  virtual std::optional<Data> thumbnail(const UniqueFd& file, const ThumbnailRequest& request) = 0;
  /// The width in pixels of each image in the file; 0 for one that tells none; empty when there is no image.
  virtual std::vector<std::uint32_t> imageWidths(const UniqueFd& file) = 0;
  /// One image in its own size.
  virtual std::optional<Image> image(const UniqueFd& file, std::uint32_t index) = 0;
};

}  // namespace brivo
