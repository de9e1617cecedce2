// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/base/value.h"

namespace brivo {

/// Classes of embedded images, by their width.
enum class SubImageType : std::uint8_t { none, smallThumbnail, ptpSubThumbnailImage, previewImage };

/// The class as clients and logs know it; empty for none.
std::string_view nameOfSubImageType(SubImageType type);

/// The description of a finished JPEG inside a file. *Immutable.*
struct SubImage {
  std::uint32_t JPEGOffset = 0;  ///< bytes from the start of the file
  std::uint32_t JPEGLength = 0;  ///< bytes
  std::uint32_t ImageWidth = 0;  ///< pixels, as is the next
  std::uint32_t ImageHeight = 0;
  std::uint16_t Orientation = 0;  ///< EXIF, 1 to 8; 0 when it is not stated
  SubImageType imageType = SubImageType::none;

  /// From a dictionary with these keys. "Width" and "Height" stand in for an image size that is absent or 0;
  /// what does not fit its field counts as 0.
  static SubImage fromDictionary(const Dictionary& description);

  friend bool operator==(const SubImage&, const SubImage&) = default;
};

/// Who defines the codes of description errors, and the codes.
inline constexpr std::string_view kSubImageErrorDomain = "org.orvid.brivo";
inline constexpr std::int64_t kSubImageHasNoSize = -2;
inline constexpr std::int64_t kSubImageHasNoPlace = -4;

/// The class of an image of this width: 160 is the standard thumbnail of EXIF and DCF; from 1025 to 1399
/// pixels there is none.
SubImageType subImageTypeForWidth(std::uint32_t width);

/// The description with its class. None for a missing one and for one without width or height, with the error
/// -2. A description without offset or length is given, with the error -4 and without a class: callers look
/// at "JPEGOffset" before they use it. `error` may be null.
std::optional<SubImage> validatedSubImage(const SubImage* description, Error* error);

/// The embedded images of one file, at most one of each width. *Thread-bound.*
class SubImages {
 public:
  /// Adds a description with a width; false, with nothing changed, when that width is taken.
  bool add(const SubImage& image);
  /// The narrowest image that is at least `width` pixels wide, compared as signed numbers of 32 bits; null
  /// when there is none. Valid until the next add().
  const SubImage* forPixelWidth(std::uint32_t width) const;

  /// In ascending order of width.
  const std::vector<SubImage>& all() const { return images_; }

 private:
  std::vector<SubImage> images_;
};

}  // namespace brivo
