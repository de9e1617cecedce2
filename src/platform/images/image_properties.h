// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <vector>

#include "platform/base/value.h"
#include "platform/images/exif_entries.h"

namespace brivo::images {

/// Pixels.
struct PixelSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  explicit operator bool() const { return width != 0 && height != 0; }
  friend bool operator==(const PixelSize&, const PixelSize&) = default;
};

/// A finished JPEG inside an image file.
struct EmbeddedImage {
  std::uint64_t offset = 0;       ///< bytes from the start of the file
  std::uint64_t length = 0;       ///< bytes
  PixelSize size;                 ///< from its own frame header; 0 × 0 when that cannot be read
  std::uint16_t orientation = 0;  ///< EXIF, 1 to 8; 0 when it is not stated
  explicit operator bool() const { return offset != 0 && length != 0; }
};

/// What a file says of the image in it, without one pixel decoded.
struct ImageProperties {
  PixelSize size;           ///< as stored: before the orientation is applied; 0 × 0 when it is not known
  std::uint16_t depth = 0;  ///< bits per sample; 0 when it is not known
  std::uint16_t orientation = 0;        ///< how a viewer shows it (EXIF, 1 to 8); 0 when nothing is stated
  ExifEntries entries;                  ///< EXIF, TIFF, GPS and maker-note entries
  EmbeddedImage thumbnail;              ///< the EXIF thumbnail
  std::vector<EmbeddedImage> embedded;  ///< every embedded JPEG; filled when previews are asked for
  PixelSize crop;                       ///< displayed size of a raw image, before the orientation is applied

  /// Some of it is known.
  explicit operator bool() const {
    return size || crop || thumbnail || !entries.empty() || !embedded.empty();
  }
};

// The same as the property dictionaries that clients know.

/// The EXIF entries under their standard names, and with them "PixelWidth", "PixelHeight", "Depth",
/// "Orientation", "ThumbnailOffset", "ThumbnailSize" (bytes from the start of the file), "ThumbnailWidth" and
/// "ThumbnailHeight", as far as they are known.
Dictionary exifDictionary(const ImageProperties& properties);
/// exifDictionary() with "{TIFF}" and "{MakerNorel}" in it.
Dictionary flatDictionary(const ImageProperties& properties);
/// "{Exif}" (only when the file carries EXIF), "{TIFF}", "{GPS}" and "{MakerNorel}", with "PixelWidth",
/// "PixelHeight", "Depth" and "Orientation" beside them.
Dictionary nestedDictionary(const ImageProperties& properties);
/// "{raw}" with "Thumbnails" (each with "JPEGOffset", "JPEGLength", "Width", "Height" and, when it is stated,
/// "Orientation"), "CropSize" ("Width", "Height") and "Orientation", as far as they are known.
Dictionary containerDictionary(const ImageProperties& properties);

}  // namespace brivo::images
