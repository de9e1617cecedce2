// SPDX-License-Identifier: MIT
#pragma once

#include <libraw/libraw.h>

#include <cstdint>
#include <optional>

#include "imaging/picture.h"
#include "imaging/raw_stream.h"
#include "platform/images/byte_source.h"
#include "platform/images/image_properties.h"

namespace brivo::imaging {

/// A camera raw file, read with LibRaw. No file is opened and no thread started. It is large: for the heap.
/// *Thread-bound.*
class RawImage {
 public:
  /// `source` must outlive this. Nothing is read yet.
  explicit RawImage(const images::ByteSource& source);

  /// Reads the headers, once and before all else; false when LibRaw does not know the file.
  bool open();
  /// As the file states it, before the orientation is applied.
  images::PixelSize size() const;
  /// The preview that LibRaw holds for the file's best, if its longer side has at least `least` pixels; a
  /// JPEG may be scaled down as far as `maximumPixelSize` allows (0: not at all).
  std::optional<Picture> preview(std::uint32_t least, std::uint32_t maximumPixelSize);
  /// The sensor's pixels in sRGB with the camera's white balance, in half the size if the longer side then
  /// still has `wanted` pixels. Call it once and last.
  std::optional<Picture> develop(std::uint32_t wanted);

 private:
  bool isPlausible();

  RawStream stream_;
  LibRaw raw_;
};

}  // namespace brivo::imaging
