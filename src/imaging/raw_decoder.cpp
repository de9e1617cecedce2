// SPDX-License-Identifier: MIT
#include <algorithm>
#include <limits>
#include <memory>
#include <vector>

#include "imaging/decode_request.h"
#include "imaging/raw_image.h"
#include "imaging/slice_source.h"
#include "platform/images/image_reader.h"

namespace brivo::imaging {

namespace {

using images::ByteSource;
using images::EmbeddedImage;
using images::ImageProperties;
using images::PixelSize;

/// Previews of one file that are tried, so that a file of broken ones is soon done.
constexpr std::size_t kMostTries = 4;

std::uint32_t longerSide(PixelSize size) { return std::max(size.width, size.height); }
std::uint32_t sideOf(const EmbeddedImage& preview) { return longerSide(preview.size); }

/// What the longer side of a picture must have to serve `request`; of an image of unknown size, no preview is
/// known to be the whole.
std::uint32_t wantedSide(PixelSize image, const ThumbnailRequest& request) {
  const std::uint32_t whole = image ? longerSide(image) : std::numeric_limits<std::uint32_t>::max();
  return request.maximumPixelSize == 0 ? whole : std::min(request.maximumPixelSize, whole);
}

/// Those that are large enough, the smallest of them first.
std::vector<EmbeddedImage> largeEnough(std::vector<EmbeddedImage> previews, std::uint32_t wanted) {
  std::erase_if(previews, [&](const EmbeddedImage& preview) { return sideOf(preview) < wanted; });
  std::ranges::stable_sort(previews, {}, sideOf);
  return previews;
}

/// The same, and behind them those that are too small, the largest of them first.
std::vector<EmbeddedImage> fromBest(std::vector<EmbeddedImage> previews, std::uint32_t wanted) {
  auto best = largeEnough(previews, wanted);
  std::erase_if(previews, [&](const EmbeddedImage& preview) { return sideOf(preview) >= wanted; });
  std::ranges::stable_sort(previews, std::ranges::greater{}, sideOf);
  best.insert(best.end(), previews.begin(), previews.end());
  return best;
}

/// The first of the previews that can be decoded.
std::optional<Picture> firstOf(const std::vector<EmbeddedImage>& previews, const ByteSource& source,
                               const ThumbnailRequest& request) {
  for (std::size_t i = 0; i < std::min(previews.size(), kMostTries); ++i) {
    auto picture = decodeJpeg(SliceSource(source, previews[i].offset, previews[i].length), request);
    if (picture) return picture;
  }
  return {};
}

/// A preview that our own reader has found: large enough, or of any size where it may be.
std::optional<Picture> storedPicture(const ByteSource& source, const std::vector<EmbeddedImage>& previews,
                                     std::uint32_t wanted, const ThumbnailRequest& request) {
  const bool mayBeSmall = request.source != ThumbnailSource::full;
  // What a preview holds as a thumbnail of its own is of no use.
  const ThumbnailRequest whole{request.maximumPixelSize, ThumbnailSource::full, {}};
  return firstOf(mayBeSmall ? fromBest(previews, wanted) : largeEnough(previews, wanted), source, whole);
}

/// The same with LibRaw, which knows more files and can develop the sensor image.
std::optional<Picture> libRawPicture(const ByteSource& source, const ImageProperties& properties,
                                     const ThumbnailRequest& request) {
  const auto raw = std::make_unique<RawImage>(source);
  if (!raw->open()) return {};
  const std::uint32_t wanted = wantedSide(properties.crop ? properties.crop : raw->size(), request);
  auto picture = properties.crop ? std::nullopt : storedPicture(source, properties.embedded, wanted, request);
  if (!picture)
    picture = raw->preview(request.source == ThumbnailSource::full ? wanted : 1, request.maximumPixelSize);
  if (picture || request.source == ThumbnailSource::embedded) return picture;
  return raw->develop(wanted);
}

}  // namespace

std::optional<Picture> decodeRaw(const ByteSource& source, const ThumbnailRequest& request) {
  const ImageProperties properties = images::copyContainerProperties(source).value_or(ImageProperties());
  if (properties.crop) {  // a raw file for certain; others can be plain TIFF
    const std::uint32_t wanted = wantedSide(properties.crop, request);
    if (auto picture = storedPicture(source, properties.embedded, wanted, request)) return picture;
  }
  try {
    return libRawPicture(source, properties, request);
  } catch (...) {  // LibRaw throws numbers of its own
    return {};
  }
}

}  // namespace brivo::imaging
