// SPDX-License-Identifier: MIT
#include "util/images.h"

#include <algorithm>
#include <array>
#include <new>
#include <span>

#include "platform/files/file_system.h"

namespace brivo {

namespace {

/// x' = a·x + c·y + tx and y' = b·x + d·y + ty, from the lower left; the translation in widths and heights of
/// the image.
struct Transform {
  int a, b, c, d;
  int txWidths, txHeights, tyWidths, tyHeights;
};

/// By EXIF orientation, from 1 on.
constexpr std::array<Transform, 8> kTransforms{{
    {1, 0, 0, 1, 0, 0, 0, 0},
    {-1, 0, 0, 1, 1, 0, 0, 0},
    {-1, 0, 0, -1, 1, 0, 0, 1},
    {1, 0, 0, -1, 0, 0, 0, 1},
    {0, -1, -1, 0, 0, 1, 1, 0},
    {0, -1, 1, 0, 0, 0, 1, 0},
    {0, 1, 1, 0, 0, 0, 0, 0},
    {0, 1, -1, 0, 0, 1, 0, 0},
}};
constexpr int kFirstOnItsSide = 5;

/// An image on its canvas: where its pixels go.
class Placement {
 public:
  Placement(const Transform& transform, const Image& image, const Image& canvas)
      : t_(transform), image_(image), canvas_(canvas) {}

  /// The number of the canvas's pixel, row by row from the upper left, where the image's goes.
  std::int64_t of(std::int64_t x, std::int64_t y) const {
    // Twice the coordinates of the middle of the pixel, from the lower left: whole numbers.
    const std::int64_t x2 = 2 * x + 1;
    const std::int64_t y2 = 2 * (std::int64_t{image_.height} - y) - 1;
    const std::int64_t toX2 = t_.a * x2 + t_.c * y2 + 2 * translation(t_.txWidths, t_.txHeights);
    const std::int64_t toY2 = t_.b * x2 + t_.d * y2 + 2 * translation(t_.tyWidths, t_.tyHeights);
    return (canvas_.height - 1 - toY2 / 2) * canvas_.width + toX2 / 2;
  }

 private:
  std::int64_t translation(std::int64_t widths, std::int64_t heights) const {
    return widths * image_.width + heights * image_.height;
  }

  const Transform& t_;
  const Image& image_;
  const Image& canvas_;
};

Image drawn(const Image& image, const Transform& transform, bool onItsSide) {
  Image canvas = image;
  if (onItsSide) std::swap(canvas.width, canvas.height);
  std::vector<std::byte> pixels(image.pixels.size());
  const Placement placement(transform, image, canvas);
  const std::int64_t step = placement.of(1, 0) - placement.of(0, 0);
  auto from = image.pixels.bytes();
  for (std::uint32_t y = 0; y < image.height; ++y) {
    std::int64_t to = placement.of(0, y);
    for (std::uint32_t x = 0; x < image.width; ++x, to += step) {
      const auto target = std::span(pixels).subspan(static_cast<std::size_t>(to) * image.bytesPerPixel);
      std::ranges::copy(from.first(image.bytesPerPixel), target.begin());
      from = from.subspan(image.bytesPerPixel);
    }
  }
  canvas.pixels = Data(std::move(pixels));
  return canvas;
}

}  // namespace

std::optional<Data> OVCreateJPEGThumbnailDataFromURL(ImageDecoder& decoder, const Url* url,
                                                     std::int32_t maximumPixelSize) {
  if (!url) return std::nullopt;
  const auto file = systemFiles().open(url->path());
  if (!file.ok()) return std::nullopt;
  const auto maximum = static_cast<std::uint32_t>(std::max(maximumPixelSize, 0));
  return decoder.thumbnail(*file, {maximum, ThumbnailSource::embeddedElseFull});
}

std::optional<Image> OVCreateThumbnailFromIconFile(ImageDecoder& decoder, const std::string* path,
                                                   std::uint32_t size) {
  if (!path) return std::nullopt;
  const auto file = systemFiles().open(*path);
  if (!file.ok()) return std::nullopt;
  const std::vector<std::uint32_t> widths = decoder.imageWidths(*file);
  if (widths.size() < 2) return decoder.image(*file, 0);
  const auto first = std::ranges::find_if(widths, [](std::uint32_t width) { return width != 0; });
  if (first == widths.end()) return std::nullopt;
  const auto score = [size](std::uint32_t width) { return size / std::max(width, size); };  // 1 when it fits
  auto best = first;
  for (auto image = first; image != widths.end(); ++image) {
    if (*image != 0 && score(*image) > score(*best)) best = image;
  }
  return decoder.image(*file, static_cast<std::uint32_t>(best - widths.begin()));
}

std::optional<Image> OVCreateRotatedImage(std::int32_t orientation, const std::optional<Image>& image) {
  if (!image) return std::nullopt;
  const std::int32_t known = orientation >= 1 && orientation <= 8 ? orientation : 1;
  try {
    return drawn(*image, kTransforms[static_cast<std::size_t>(known - 1)], known >= kFirstOnItsSide);
  } catch (const std::bad_alloc&) {
    return image;
  }
}

}  // namespace brivo
