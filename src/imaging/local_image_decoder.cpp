// SPDX-License-Identifier: MIT
#include "imaging/local_image_decoder.h"

extern "C" {
#include <libavutil/cpu.h>
}

#include <array>

#include "imaging/decode_request.h"
#include "imaging/descriptor_source.h"
#include "imaging/icon_file.h"
#include "imaging/jpeg_encoder.h"
#include "imaging/scaling.h"

namespace brivo {

using imaging::Extent;

namespace {

Extent extentOf(const AVFrame& frame) {
  return {static_cast<std::uint32_t>(frame.width), static_cast<std::uint32_t>(frame.height)};
}

Data packed(const AVFrame& frame, std::size_t bytesPerPixel) {
  std::vector<std::byte> pixels;
  const std::size_t rowBytes = bytesPerPixel * static_cast<std::size_t>(frame.width);
  pixels.reserve(rowBytes * static_cast<std::size_t>(frame.height));
  for (int y = 0; y < frame.height; ++y) {
    const auto row = std::as_bytes(
        std::span(frame.data[0] + static_cast<std::ptrdiff_t>(frame.linesize[0]) * y, rowBytes));
    pixels.insert(pixels.end(), row.begin(), row.end());
  }
  return Data(std::move(pixels));
}

}  // namespace

void LocalImageDecoder::prepare() {
  av_cpu_count();
  av_get_cpu_flags();
}

std::optional<Data> LocalImageDecoder::thumbnail(const UniqueFd& file, const ThumbnailRequest& request) {
  const imaging::DescriptorSource source(file);
  auto picture = imaging::decodeImage(source, request);
  if (!picture) return std::nullopt;
  const Extent size = imaging::fitted(extentOf(*picture->frame), request.maximumPixelSize);
  picture->frame = imaging::scaledForJpeg(std::move(picture->frame), size);
  if (!picture->frame) return std::nullopt;
  std::vector<std::byte> jpeg = imaging::encodeJpeg(*picture);
  return jpeg.empty() ? std::nullopt : std::optional(Data(std::move(jpeg)));
}

std::vector<std::uint32_t> LocalImageDecoder::imageWidths(const UniqueFd& file) {
  const imaging::DescriptorSource source(file);
  auto widths = imaging::iconWidths(source);
  if (!widths.empty()) return widths;
  const auto picture = imaging::decodeImage(source, {});
  return picture ? std::vector{extentOf(*picture->frame).width} : widths;
}

std::optional<Image> LocalImageDecoder::image(const UniqueFd& file, std::uint32_t index) {
  const imaging::DescriptorSource source(file);
  auto picture = imaging::decodeIcon(source, index);
  if (!picture && index == 0) picture = imaging::decodeImage(source, {});
  const imaging::Frame pixels = picture ? imaging::unpacked(*picture->frame) : nullptr;
  if (!pixels) return std::nullopt;
  const std::uint32_t bytesPerPixel = pixels->format == AV_PIX_FMT_GRAY8 ? 1 : 4;
  const Extent size = extentOf(*pixels);
  return Image{size.width, size.height, bytesPerPixel, packed(*pixels, bytesPerPixel)};
}

}  // namespace brivo
