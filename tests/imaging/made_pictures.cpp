// SPDX-License-Identifier: MIT
#include "imaging/made_pictures.h"

#include <cstdlib>
#include <span>

#include "imaging/jpeg_encoder.h"
#include "support/image_bytes.h"

namespace brivo::test {

namespace {

std::span<std::uint8_t> rowOf(const AVFrame& frame, std::size_t plane, int y, int width) {
  return {frame.data[plane] + static_cast<std::ptrdiff_t>(frame.linesize[plane]) * y,
          static_cast<std::size_t>(width)};
}

std::uint8_t between(int from, int to, std::size_t part, std::size_t whole) {
  if (whole <= 1) return static_cast<std::uint8_t>(from);
  return static_cast<std::uint8_t>(from + (to - from) * static_cast<int>(part) / static_cast<int>(whole - 1));
}

}  // namespace

imaging::Frame madeFrame(std::uint32_t width, std::uint32_t height) {
  imaging::Frame frame = imaging::makeFrame(AV_PIX_FMT_YUV420P, width, height);
  for (int y = 0; y < frame->height; ++y) {
    const auto row = rowOf(*frame, 0, y, frame->width);
    for (std::size_t x = 0; x < row.size(); ++x) row[x] = between(16, 240, x, row.size());
  }
  const int chromaHeight = (frame->height + 1) / 2;
  for (int y = 0; y < chromaHeight; ++y) {
    const auto part = static_cast<std::size_t>(y);
    const auto whole = static_cast<std::size_t>(chromaHeight);
    std::ranges::fill(rowOf(*frame, 1, y, (frame->width + 1) / 2), between(200, 60, part, whole));
    std::ranges::fill(rowOf(*frame, 2, y, (frame->width + 1) / 2), between(60, 200, part, whole));
  }
  frame->color_range = AVCOL_RANGE_JPEG;
  return frame;
}

std::string madeJpeg(std::uint32_t width, std::uint32_t height, std::string_view iccProfile) {
  const auto profile = std::as_bytes(std::span(iccProfile));
  const auto bytes = imaging::encodeJpeg({madeFrame(width, height), {profile.begin(), profile.end()}});
  return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

std::string withExifThumbnail(const std::string& jpeg, std::string thumbnail, unsigned orientation) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  if (orientation != 0) tiff.shorts(0x0112, {orientation});
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, std::move(thumbnail));
  return jpeg.substr(0, 2) + exifSegment(tiff.build()) + jpeg.substr(2);
}

double meanDifference(const AVFrame& a, const AVFrame& b) {
  double sum = 0;
  for (int y = 0; y < a.height; ++y) {
    const auto rowA = rowOf(a, 0, y, a.width);
    const auto rowB = rowOf(b, 0, y, b.width);
    for (std::size_t x = 0; x < rowA.size(); ++x) sum += std::abs(rowA[x] - rowB[x]);
  }
  return sum / a.width / a.height;
}

}  // namespace brivo::test
