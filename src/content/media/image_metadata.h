// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/base/value.h"
#include "platform/images/image_properties.h"

namespace brivo {

/// The metadata dictionary of a still image, before it is one. *Immutable.*
struct ImageMetadata {
  images::ImageProperties properties;
  // What the dictionary says beside the properties: the displayed size in pixels and the EXIF orientation.
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::optional<std::uint16_t> orientation;

  /// "{Exif}" and "{TIFF}" whole; "{MakerNorel}" with its entry "17" alone; "PixelWidth", "PixelXDimension",
  /// "PixelHeight", "PixelYDimension", "Orientation" and "Depth". What is not known is left out.
  Dictionary dictionary() const;

  /// When the picture was taken and when it was digitised, as EXIF has it; none when neither is stated.
  ///
  /// Creation is "DateTimeOriginal", else the "DateTime" of TIFF, else that of EXIF; but where there is
  /// neither "DateTimeDigitized" nor a "DateTime" of TIFF, a "DateTime" of EXIF wins.
  std::optional<std::string> creationDateTime() const;
  /// "DateTimeDigitized", else the "DateTime" of TIFF.
  std::optional<std::string> modificationDateTime() const;

 private:
  std::optional<std::string> text(images::ExifGroup group, const char* name) const;
};

}  // namespace brivo
