// SPDX-License-Identifier: MIT
#include "content/media/sub_images.h"

#include <algorithm>
#include <limits>

namespace brivo {

namespace {

constexpr std::uint32_t kStandardWidth = 160;
constexpr std::uint32_t kWidestThumbnail = 1024;
constexpr std::uint32_t kNarrowestPreview = 1400;

template <class Number>
Number numberAt(const Dictionary& description, std::string_view key) {
  const std::uint64_t number = description.unsignedInteger(key).value_or(0);
  return number <= std::numeric_limits<Number>::max() ? static_cast<Number>(number) : Number{0};
}

std::int32_t asSigned(std::uint32_t width) { return static_cast<std::int32_t>(width); }

void setError(Error* error, std::int64_t code, const char* text) {
  if (error) *error = {std::string(kSubImageErrorDomain), code, text};
}

}  // namespace

std::string_view nameOfSubImageType(SubImageType type) {
  switch (type) {
    case SubImageType::smallThumbnail:
      return "smallThumbnail";
    case SubImageType::ptpSubThumbnailImage:
      return "ptpSubThumbnailImage";
    case SubImageType::previewImage:
      return "previewImage";
    case SubImageType::none:
      break;
  }
  return {};
}

SubImage SubImage::fromDictionary(const Dictionary& description) {
  SubImage image;
  image.JPEGOffset = numberAt<std::uint32_t>(description, "JPEGOffset");
  image.JPEGLength = numberAt<std::uint32_t>(description, "JPEGLength");
  image.ImageWidth = numberAt<std::uint32_t>(description, "ImageWidth");
  if (image.ImageWidth == 0) image.ImageWidth = numberAt<std::uint32_t>(description, "Width");
  image.ImageHeight = numberAt<std::uint32_t>(description, "ImageHeight");
  if (image.ImageHeight == 0) image.ImageHeight = numberAt<std::uint32_t>(description, "Height");
  image.Orientation = numberAt<std::uint16_t>(description, "Orientation");
  return image;
}

SubImageType subImageTypeForWidth(std::uint32_t width) {
  if (width == kStandardWidth) return SubImageType::smallThumbnail;
  if (width >= 1 && width <= kWidestThumbnail) return SubImageType::ptpSubThumbnailImage;
  if (width >= kNarrowestPreview) return SubImageType::previewImage;
  return SubImageType::none;
}

std::optional<SubImage> validatedSubImage(const SubImage* description, Error* error) {
  if (!description) return std::nullopt;
  if (description->ImageWidth == 0 || description->ImageHeight == 0) {
    setError(error, kSubImageHasNoSize, "an embedded image without width or height");
    return std::nullopt;
  }
  SubImage image = *description;
  if (image.JPEGOffset == 0 || image.JPEGLength == 0) {
    setError(error, kSubImageHasNoPlace, "an embedded image without offset or length");
    return image;
  }
  image.imageType = subImageTypeForWidth(image.ImageWidth);
  return image;
}

bool SubImages::add(const SubImage& image) {
  const auto place = std::ranges::lower_bound(images_, asSigned(image.ImageWidth), {},
                                              [](const SubImage& i) { return asSigned(i.ImageWidth); });
  if (image.ImageWidth == 0 || (place != images_.end() && place->ImageWidth == image.ImageWidth))
    return false;
  images_.insert(place, image);
  return true;
}

const SubImage* SubImages::forPixelWidth(std::uint32_t width) const {
  const auto place = std::ranges::lower_bound(images_, asSigned(width), {},
                                              [](const SubImage& i) { return asSigned(i.ImageWidth); });
  return place == images_.end() ? nullptr : &*place;
}

}  // namespace brivo
