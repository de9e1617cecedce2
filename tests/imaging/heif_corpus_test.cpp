// SPDX-License-Identifier: MIT
// Real files, against what libheif and its own decoders make of them.
#include <gtest/gtest.h>
#include <libheif/heif.h>

extern "C" {
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <cmath>
#include <memory>

#include "corpus.h"
#include "file_source.h"
#include "imaging/decode_request.h"

namespace brivo::imaging {
namespace {

using images::Corpus;
using images::CorpusFile;
using images::FileSource;

struct FreeObject {
  void operator()(heif_context* context) const { heif_context_free(context); }
  void operator()(heif_image_handle* handle) const { heif_image_handle_release(handle); }
  void operator()(heif_image* image) const { heif_image_release(image); }
  void operator()(heif_decoding_options* options) const { heif_decoding_options_free(options); }
};
using Image = std::unique_ptr<heif_image, FreeObject>;

/// The primary picture as it is stored, in 8-bit RGB; null when libheif cannot read the file.
Image decodedByLibheif(const std::string& path, const char* decoder) {
  const std::unique_ptr<heif_context, FreeObject> context(heif_context_alloc());
  heif_context_read_from_file(context.get(), path.c_str(), nullptr);
  heif_image_handle* primary = nullptr;
  heif_context_get_primary_image_handle(context.get(), &primary);
  const std::unique_ptr<heif_image_handle, FreeObject> handle(primary);
  if (!handle) return nullptr;
  const std::unique_ptr<heif_decoding_options, FreeObject> options(heif_decoding_options_alloc());
  options->ignore_transformations = 1;
  options->convert_hdr_to_8bit = 1;
  options->decoder_id = decoder;
  heif_image* image = nullptr;
  heif_decode_image(handle.get(), &image, heif_colorspace_RGB, heif_chroma_interleaved_RGB, options.get());
  return Image(image);
}

/// Luma of a decoded frame, in full range of eight bits.
double lumaAt(const AVFrame& frame, int x, int y) {
  const int depth = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format))->comp[0].depth;
  const std::uint8_t* row = frame.data[0] + static_cast<std::ptrdiff_t>(y) * frame.linesize[0];
  const int value = depth > 8 ? row[2 * x] | row[2 * x + 1] << 8 : row[x];
  const double level = static_cast<double>(value) / (1 << (depth - 8));
  return frame.color_range == AVCOL_RANGE_JPEG ? level : std::clamp((level - 16) * 255 / 219, 0.0, 255.0);
}

/// How much of red and of blue is in luma (ISO/IEC 23091-2).
std::pair<double, double> weightsOf(const AVFrame& frame) {
  if (frame.colorspace == AVCOL_SPC_BT709) return {0.2126, 0.0722};
  if (frame.colorspace == AVCOL_SPC_BT2020_NCL) return {0.2627, 0.0593};
  return {0.299, 0.114};
}

/// Mean absolute difference of luma, in eight bits, between a frame and RGB.
double meanDifference(const AVFrame& frame, const heif_image& rgb) {
  int stride = 0;
  const std::uint8_t* pixels = heif_image_get_plane_readonly(&rgb, heif_channel_interleaved, &stride);
  const auto [red, blue] = weightsOf(frame);
  double sum = 0;
  for (int y = 0; y < frame.height; ++y) {
    const std::uint8_t* pixel = pixels + static_cast<std::ptrdiff_t>(y) * stride;
    for (int x = 0; x < frame.width; ++x, pixel += 3) {
      const double luma = red * pixel[0] + (1 - red - blue) * pixel[1] + blue * pixel[2];
      sum += std::abs(luma - lumaAt(frame, x, y));
    }
  }
  return sum / frame.width / frame.height;
}

bool isHeif(const CorpusFile& file) {
  return file.name.starts_with("heif/") || file.name.starts_with("avif/");
}

void compare(const Corpus& corpus, const CorpusFile& file) {
  const auto expected =
      decodedByLibheif(corpus.pathOf(file), file.name.starts_with("avif/") ? "dav1d" : "libde265");
  const FileSource source(corpus.pathOf(file));
  const auto picture = decodeHeif(source, {});
  EXPECT_TRUE(source.stayedInside());
  ASSERT_EQ(picture.has_value(), expected != nullptr);
  if (!picture) return;
  const AVFrame& frame = *picture->frame;
  ASSERT_EQ(frame.width, heif_image_get_width(expected.get(), heif_channel_interleaved));
  ASSERT_EQ(frame.height, heif_image_get_height(expected.get(), heif_channel_interleaved));
  EXPECT_LT(meanDifference(frame, *expected), 2);
}

TEST(HeifCorpus, EveryPictureIsTheOneThatLibheifDecodes) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  std::size_t pictures = 0;
  for (const CorpusFile& file : corpus->files()) {
    if (!isHeif(file)) continue;
    SCOPED_TRACE(file.name);
    compare(*corpus, file);
    ++pictures;
  }
  EXPECT_GT(pictures, 20U);
}

TEST(HeifCorpus, SmallRequestsReadNoMoreThanTheThumbnailNeeds) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  const FileSource source(corpus->pathOf({"heif/me-Issue_487.heic", {}}));
  const auto picture = decodeHeif(source, {.maximumPixelSize = 300, .imageTallerThan = {}});
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 512);
  EXPECT_EQ(picture->frame->height, 384);
  EXPECT_LT(source.bytesAsked(), source.size() / 4);
}

TEST(HeifCorpus, ACutFileGivesAWholePictureOrNone) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  const FileSource whole(corpus->pathOf({"heif/me-cheers_1440x960.heic", {}}));
  std::vector<std::byte> bytes(whole.size());
  ASSERT_TRUE(images::readAll(whole, bytes, 0));
  ASSERT_TRUE(decodeHeif(images::MemorySource(bytes), {}));
  constexpr std::size_t kEndOfPrimary = 38'467;  // behind it lies the thumbnail
  constexpr std::size_t kCuts = 64;
  for (std::size_t i = 0; i < kCuts; ++i) {
    const std::span<const std::byte> left(bytes.data(), bytes.size() * i / kCuts);
    const auto picture = decodeHeif(images::MemorySource(left), {});
    EXPECT_EQ(picture.has_value(), left.size() >= kEndOfPrimary) << left.size();
    if (picture) {
      EXPECT_EQ(picture->frame->width, 1440);
      EXPECT_EQ(picture->frame->height, 960);
    }
  }
}

}  // namespace
}  // namespace brivo::imaging
