// SPDX-License-Identifier: MIT
#include "imaging/scaling.h"

extern "C" {
#include <libavutil/opt.h>
#include <libavutil/pixdesc.h>
#include <libswscale/swscale.h>
}

#include <array>
#include <cmath>
#include <span>

namespace brivo::imaging {

namespace {

struct FreeContext {
  void operator()(SwsContext* context) const { sws_freeContext(context); }
};
using Context = std::unique_ptr<SwsContext, FreeContext>;

AVPixelFormat formatOf(const AVFrame& frame) { return static_cast<AVPixelFormat>(frame.format); }

bool hasFlag(const AVFrame& frame, std::uint64_t flag) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(formatOf(frame));
  return format && (format->flags & flag) != 0;
}

bool hasAlpha(const AVFrame& frame) {
  return hasFlag(frame, AV_PIX_FMT_FLAG_ALPHA) || hasFlag(frame, AV_PIX_FMT_FLAG_PAL);
}

bool isGrey(const AVFrame& frame) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(formatOf(frame));
  return format && format->nb_components == 1 && !hasFlag(frame, AV_PIX_FMT_FLAG_PAL);
}

bool isFullRange(const AVFrame& frame) {
  if (hasFlag(frame, AV_PIX_FMT_FLAG_RGB) || isGrey(frame)) return frame.color_range != AVCOL_RANGE_MPEG;
  return frame.color_range == AVCOL_RANGE_JPEG;
}

/// What a frame leaves open is as JPEG has it.
int matrixOf(const AVFrame& frame) {
  switch (frame.colorspace) {
    case AVCOL_SPC_BT709:
      return SWS_CS_ITU709;
    case AVCOL_SPC_BT2020_NCL:
    case AVCOL_SPC_BT2020_CL:
      return SWS_CS_BT2020;
    case AVCOL_SPC_FCC:
      return SWS_CS_FCC;
    case AVCOL_SPC_SMPTE240M:
      return SWS_CS_SMPTE240M;
    default:
      return SWS_CS_ITU601;
  }
}

/// Ranges are set before the context is made ready: it would copy frames of one size and format as they are.
Context contextFor(const AVFrame& from, const AVFrame& to) {
  Context context(sws_alloc_context());
  if (!context) return nullptr;
  const auto set = [&](const char* name, int value) { av_opt_set_int(context.get(), name, value, 0); };
  set("srcw", from.width);
  set("srch", from.height);
  set("src_format", from.format);
  set("src_range", isFullRange(from) ? 1 : 0);
  set("dstw", to.width);
  set("dsth", to.height);
  set("dst_format", to.format);
  set("dst_range", 1);
  set("sws_flags", SWS_BICUBIC | SWS_ACCURATE_RND | SWS_FULL_CHR_H_INP | SWS_FULL_CHR_H_INT);
  constexpr int kNeutral = 1 << 16;  // of contrast and saturation, as 16.16
  sws_setColorspaceDetails(context.get(), sws_getCoefficients(matrixOf(from)), isFullRange(from) ? 1 : 0,
                           sws_getCoefficients(matrixOf(to)), 1, 0, kNeutral, kNeutral);
  return sws_init_context(context.get(), nullptr, nullptr) >= 0 ? std::move(context) : nullptr;
}

bool convert(const AVFrame& from, AVFrame& to) {
  to.color_range = AVCOL_RANGE_JPEG;
  to.colorspace = AVCOL_SPC_SMPTE170M;
  const Context context = contextFor(from, to);
  return context && sws_scale(context.get(), from.data, from.linesize, 0, from.height, to.data,
                              to.linesize) == to.height;
}

Frame converted(const AVFrame& from, AVPixelFormat format, Extent to) {
  Frame frame = makeFrame(format, to.width, to.height);
  return frame && convert(from, *frame) ? std::move(frame) : nullptr;
}

using Pixel = std::array<std::uint8_t, 4>;

/// A row of a frame with four bytes a pixel.
std::span<Pixel> pixelsOf(AVFrame& frame, int row) {
  std::uint8_t* start = frame.data[0] + static_cast<std::ptrdiff_t>(frame.linesize[0]) * row;
  return {reinterpret_cast<Pixel*>(start), static_cast<std::size_t>(frame.width)};
}

constexpr unsigned kOpaque = 255;

std::uint8_t partOf(unsigned sample, unsigned alpha) {
  return static_cast<std::uint8_t>((sample * alpha + kOpaque / 2) / kOpaque);
}

void putOnWhite(std::span<Pixel> rgba) {
  for (auto& [red, green, blue, alpha] : rgba) {
    const auto white = static_cast<std::uint8_t>(kOpaque - alpha);
    red = static_cast<std::uint8_t>(partOf(red, alpha) + white);
    green = static_cast<std::uint8_t>(partOf(green, alpha) + white);
    blue = static_cast<std::uint8_t>(partOf(blue, alpha) + white);
  }
}

void premultiply(std::span<Pixel> argb) {
  for (auto& [alpha, red, green, blue] : argb) {
    red = partOf(red, alpha);
    green = partOf(green, alpha);
    blue = partOf(blue, alpha);
  }
}

bool isAsJpegHasIt(const AVFrame& frame, Extent size) {
  const bool sameSize = static_cast<std::uint32_t>(frame.width) == size.width &&
                        static_cast<std::uint32_t>(frame.height) == size.height;
  return sameSize && isFullRange(frame) && matrixOf(frame) == SWS_CS_ITU601 &&
         (frame.format == AV_PIX_FMT_YUV420P || frame.format == AV_PIX_FMT_GRAY8);
}

}  // namespace

Extent fitted(Extent image, std::uint32_t maximum) {
  const std::uint32_t longest = std::max(image.width, image.height);
  if (maximum == 0 || longest <= maximum) return image;
  const auto part = [&](std::uint32_t side) {
    return std::max(1U,
                    static_cast<std::uint32_t>(std::lround(static_cast<double>(side) * maximum / longest)));
  };
  return {part(image.width), part(image.height)};
}

Frame scaledForJpeg(Frame source, Extent to) {
  if (isAsJpegHasIt(*source, to)) return source;
  if (!hasAlpha(*source)) {
    return converted(*source, isGrey(*source) ? AV_PIX_FMT_GRAY8 : AV_PIX_FMT_YUV420P, to);
  }
  const Frame seen = converted(*source, AV_PIX_FMT_RGBA, to);
  if (!seen) return nullptr;
  for (int y = 0; y < seen->height; ++y) putOnWhite(pixelsOf(*seen, y));
  seen->format = AV_PIX_FMT_RGB0;
  return converted(*seen, AV_PIX_FMT_YUV420P, to);
}

Frame unpacked(const AVFrame& source) {
  const Extent size{static_cast<std::uint32_t>(source.width), static_cast<std::uint32_t>(source.height)};
  if (isGrey(source)) return converted(source, AV_PIX_FMT_GRAY8, size);
  Frame pixels = converted(source, AV_PIX_FMT_ARGB, size);
  for (int y = 0; pixels && hasAlpha(source) && y < pixels->height; ++y) premultiply(pixelsOf(*pixels, y));
  return pixels;
}

}  // namespace brivo::imaging
