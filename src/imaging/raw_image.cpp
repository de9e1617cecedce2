// SPDX-License-Identifier: MIT
#include "imaging/raw_image.h"

#include <omp.h>

#include <algorithm>
#include <span>

#include "imaging/decode_request.h"
#include "platform/images/image_reader.h"

namespace brivo::imaging {

namespace {

/// Enough for the largest sensors there are, of 150 million pixels.
constexpr unsigned kMostMegabytes = 2048;
/// No camera packs a picture tighter than that.
constexpr std::uint64_t kMostPixelsPerByte = 256;

std::optional<Picture> jpegPreview(std::span<const std::byte> jpeg, std::uint32_t least,
                                   std::uint32_t maximumPixelSize) {
  const images::MemorySource source(jpeg);
  const auto properties = images::copySequentialProperties(source);
  if (!properties || std::max(properties->size.width, properties->size.height) < least) return {};
  return decodeJpeg(source, {maximumPixelSize, ThumbnailSource::full, {}});
}

std::optional<Picture> bitmapPreview(std::span<const std::byte> pixels, std::uint32_t width,
                                     std::uint32_t height) {
  Frame frame = makeFrame(AV_PIX_FMT_RGB24, width, height);
  const std::size_t row = std::size_t{3} * width;
  if (!frame || pixels.size() / row < height) return {};
  const std::span out(frame->data[0], static_cast<std::size_t>(frame->linesize[0]) * height);
  for (std::size_t y = 0; y < height; ++y) {
    const auto to = std::as_writable_bytes(out).subspan(y * static_cast<std::size_t>(frame->linesize[0]));
    std::ranges::copy(pixels.subspan(y * row, row), to.begin());
  }
  return Picture{std::move(frame), {}};
}

/// The pixels that LibRaw has finished.
std::optional<Picture> finished(LibRaw& raw) {
  int width = 0, height = 0, colors = 0, bits = 0;
  raw.get_mem_image_format(&width, &height, &colors, &bits);
  if (width <= 0 || height <= 0 || bits != 8 || (colors != 1 && colors != 3)) return {};
  Frame frame = makeFrame(colors == 3 ? AV_PIX_FMT_RGB24 : AV_PIX_FMT_GRAY8,
                          static_cast<std::uint32_t>(width), static_cast<std::uint32_t>(height));
  if (!frame || raw.copy_mem_image(frame->data[0], frame->linesize[0], 0) != LIBRAW_SUCCESS) return {};
  return Picture{std::move(frame), {}};
}

}  // namespace

RawImage::RawImage(const images::ByteSource& source)
    : stream_(source), raw_(LIBRAW_OPIONS_NO_MEMERR_CALLBACK | LIBRAW_OPIONS_NO_DATAERR_CALLBACK) {
  omp_set_num_threads(1);  // LibRaw would share its loops out to threads
  raw_.imgdata.params.use_camera_wb = 1;
  raw_.imgdata.params.output_color = 1;  // sRGB
  raw_.imgdata.params.output_bps = 8;
  raw_.imgdata.params.user_flip = 0;
  raw_.imgdata.params.user_qual =
      2;  // PPG: as good to the eye in a thumbnail, in half the time of the default
  raw_.imgdata.params.max_raw_memory_mb = kMostMegabytes;
}

bool RawImage::open() { return raw_.open_datastream(&stream_) == LIBRAW_SUCCESS; }

images::PixelSize RawImage::size() const { return {raw_.imgdata.sizes.width, raw_.imgdata.sizes.height}; }

std::optional<Picture> RawImage::preview(std::uint32_t least, std::uint32_t maximumPixelSize) {
  if (raw_.unpack_thumb() != LIBRAW_SUCCESS) return {};
  const auto& found = raw_.imgdata.thumbnail;
  if (!found.thumb) return {};
  const auto bytes = std::as_bytes(std::span(found.thumb, found.tlength));
  if (found.tformat == LIBRAW_THUMBNAIL_JPEG) return jpegPreview(bytes, least, maximumPixelSize);
  if (found.tformat != LIBRAW_THUMBNAIL_BITMAP || std::max(found.twidth, found.theight) < least) return {};
  return bitmapPreview(bytes, found.twidth, found.theight);
}

bool RawImage::isPlausible() {
  const auto& sizes = raw_.imgdata.sizes;
  const std::uint64_t pixels = std::uint64_t{sizes.raw_width} * sizes.raw_height;
  return isWithinLimits(sizes.raw_width, sizes.raw_height) &&
         pixels / kMostPixelsPerByte <= static_cast<std::uint64_t>(stream_.size());
}

std::optional<Picture> RawImage::develop(std::uint32_t wanted) {
  if (!isPlausible()) return {};
  raw_.imgdata.params.half_size = std::max(size().width, size().height) / 2 >= wanted ? 1 : 0;
  if (raw_.unpack() != LIBRAW_SUCCESS || raw_.error_count() != 0) return {};
  if (raw_.dcraw_process() != LIBRAW_SUCCESS) return {};
  return finished(raw_);
}

}  // namespace brivo::imaging
