// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <csetjmp>
#include <span>

#include "imaging/decode_request.h"
#include "imaging/jpeg_errors.h"
#include "imaging/made_pictures.h"
#include "imaging/scaling.h"
#include "support/image_bytes.h"

namespace brivo::imaging {
namespace {

using test::madeFrame;
using test::madeJpeg;

std::optional<Picture> decode(const std::string& file, const ThumbnailRequest& request = {}) {
  return decodeJpeg(images::MemorySource(std::as_bytes(std::span(file))), request);
}

/// How the JPEGs of the table below are coded.
struct Coding {
  int components = 3;
  J_COLOR_SPACE pixels = JCS_RGB;
  J_COLOR_SPACE file = JCS_YCbCr;
  int across = 2;  ///< sampling factors of the first component
  int down = 2;
  bool progressive = false;
};

/// Grey pixels of this value, whatever the colour space; of CMYK only the black ink is there.
std::string coded(const Coding& coding, unsigned width, unsigned height, std::uint8_t value) {
  jpeg_compress_struct codec{};
  jpeg_error_mgr errors{};
  codec.err = jpeg_std_error(&errors);
  jpeg_create_compress(&codec);
  unsigned char* output = nullptr;
  unsigned long size = 0;
  jpeg_mem_dest(&codec, &output, &size);
  codec.image_width = width;
  codec.image_height = height;
  codec.input_components = coding.components;
  codec.in_color_space = coding.pixels;
  jpeg_set_defaults(&codec);
  jpeg_set_colorspace(&codec, coding.file);
  codec.comp_info[0].h_samp_factor = coding.across;
  codec.comp_info[0].v_samp_factor = coding.down;
  if (coding.progressive) jpeg_simple_progression(&codec);
  jpeg_start_compress(&codec, TRUE);
  std::vector<JSAMPLE> row(std::size_t{width} * static_cast<std::size_t>(coding.components), value);
  if (coding.components == 4) {
    for (std::size_t i = 0; i < row.size(); ++i)
      row[i] = i % 4 == 3 ? value : 255;  // as Adobe: 255 is no ink
  }
  JSAMPROW pointer = row.data();
  while (codec.next_scanline < height) jpeg_write_scanlines(&codec, &pointer, 1);
  jpeg_finish_compress(&codec);
  std::string file(reinterpret_cast<char*>(output), size);
  jpeg_destroy_compress(&codec);
  std::free(output);
  return file;
}

TEST(JpegDecoderTest, APictureIsDecodedInItsOwnSize) {
  const auto picture = decode(madeJpeg(120, 80));
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 120);
  EXPECT_EQ(picture->frame->height, 80);
  EXPECT_LT(test::meanDifference(*picture->frame, *madeFrame(120, 80)), 1.5);
}

TEST(JpegDecoderTest, TheTransformItselfMakesLargePicturesSmaller) {
  const auto picture = decode(madeJpeg(1600, 1200), {160});
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 400);
  EXPECT_EQ(picture->frame->height, 300);
  const auto exact = decode(madeJpeg(1600, 1200), {800});
  ASSERT_TRUE(exact);
  EXPECT_EQ(exact->frame->width, 1200) << "with something left to scale";
}

TEST(JpegDecoderTest, EverySamplingAndColourSpaceIsDecoded) {
  constexpr std::uint8_t kValue = 100;
  const std::vector<Coding> codings{{3, JCS_RGB, JCS_YCbCr, 1, 1},
                                    {3, JCS_RGB, JCS_YCbCr, 2, 1},
                                    {3, JCS_RGB, JCS_YCbCr, 2, 2},
                                    {3, JCS_RGB, JCS_YCbCr, 1, 2},
                                    {3, JCS_RGB, JCS_YCbCr, 4, 1},
                                    {3, JCS_RGB, JCS_YCbCr, 4, 2},
                                    {3, JCS_RGB, JCS_RGB, 1, 1},
                                    {1, JCS_GRAYSCALE, JCS_GRAYSCALE, 1, 1},
                                    {1, JCS_GRAYSCALE, JCS_GRAYSCALE, 2, 2},
                                    {4, JCS_CMYK, JCS_CMYK, 1, 1},
                                    {4, JCS_CMYK, JCS_YCCK, 2, 2},
                                    {3, JCS_RGB, JCS_YCbCr, 2, 2, true},
                                    {4, JCS_CMYK, JCS_YCCK, 1, 1, true}};
  for (std::size_t i = 0; i < codings.size(); ++i) {
    for (const unsigned maximum : {0u, 200u, 90u, 50u, 20u}) {
      auto picture = decode(coded(codings[i], 333, 221, kValue), {maximum});
      ASSERT_TRUE(picture) << i;
      const Extent size = fitted({333, 221}, maximum);
      const Frame frame = scaledForJpeg(std::move(picture->frame), size);
      ASSERT_TRUE(frame) << i;
      EXPECT_NEAR(frame->data[0][0], kValue, 2) << i << " at " << maximum;
      const auto last =
          static_cast<std::ptrdiff_t>(frame->linesize[0]) * (frame->height - 1) + frame->width - 1;
      EXPECT_NEAR(frame->data[0][last], kValue, 2) << i << " at " << maximum;
    }
  }
}

TEST(JpegDecoderTest, AnIccProfileComesWithThePixelsButNotOneOfInks) {
  const auto picture = decode(madeJpeg(16, 16, "a profile of colours"));
  ASSERT_TRUE(picture);
  EXPECT_EQ(
      std::string(reinterpret_cast<const char*>(picture->iccProfile.data()), picture->iccProfile.size()),
      "a profile of colours");
  const std::string inks = coded({4, JCS_CMYK, JCS_CMYK, 1, 1}, 16, 16, 0);
  const std::string segment = test::jpegSegment(0xE2, std::string("ICC_PROFILE\0\1\1a profile of inks", 30));
  const auto cmyk = decode(inks.substr(0, 2) + segment + inks.substr(2));
  ASSERT_TRUE(cmyk);
  EXPECT_TRUE(cmyk->iccProfile.empty());
}

TEST(JpegDecoderTest, OnePixelIsAPicture) {
  const auto picture = decode(madeJpeg(1, 1), {160});
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 1);
}

TEST(JpegDecoderTest, VeryLargePicturesAreDecoded) {
  const auto picture = decode(coded({1, JCS_GRAYSCALE, JCS_GRAYSCALE, 1, 1}, 30'000, 20'000, 200), {160});
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 3750) << "an eighth";
  EXPECT_EQ(picture->frame->data[0][0], 200);
}

TEST(JpegDecoderTest, AnEmbeddedThumbnailIsTakenWhereItIsAskedFor) {
  const std::string file = test::withExifThumbnail(madeJpeg(640, 480), madeJpeg(160, 120));
  const auto widthOf = [&](ThumbnailSource source) { return decode(file, {0, source, {}})->frame->width; };
  EXPECT_EQ(widthOf(ThumbnailSource::embedded), 160);
  EXPECT_EQ(widthOf(ThumbnailSource::embeddedElseFull), 160);
  EXPECT_EQ(widthOf(ThumbnailSource::full), 640);
  const auto without = decode(madeJpeg(640, 480), {0, ThumbnailSource::embeddedElseFull, {}});
  EXPECT_EQ(without->frame->width, 640);
  EXPECT_FALSE(decode(madeJpeg(640, 480), {0, ThumbnailSource::embedded, {}}));
}

TEST(JpegDecoderTest, APictureThatIsNotThereInWholeIsNone) {
  const std::string file = madeJpeg(200, 150);
  for (std::size_t length = 0; length < file.size() - 40; length += 7) {
    EXPECT_FALSE(decode(file.substr(0, length), {50})) << length;
  }
  EXPECT_TRUE(decode(file.substr(0, file.size() - 2), {50})) << "only the end marker is missing";
}

TEST(JpegDecoderTest, AHeaderThatClaimsTooMuchIsRefused) {
  EXPECT_FALSE(decode(test::jpeg(65'500, 65'500), {160}));
  EXPECT_FALSE(decode(test::jpeg(65'535, 65'535), {160}));
}

TEST(JpegDecoderTest, APictureOfThousandsOfScansIsRefused) {
  const std::string file = coded({3, JCS_RGB, JCS_YCbCr, 1, 1, true}, 16, 16, 77);
  const std::size_t scan = file.find("\xFF\xDA");
  const std::size_t next = file.find("\xFF\xC4", scan);
  ASSERT_NE(next, std::string::npos);
  std::string many = file.substr(0, scan);
  for (int i = 0; i < 2000; ++i) many += file.substr(scan, next - scan);
  EXPECT_FALSE(decode(many + file.substr(next), {8}));
}

TEST(JpegDecoderTest, DamagedPicturesEndInAPictureOrNone) {
  const std::string good = test::withExifThumbnail(madeJpeg(64, 48), madeJpeg(16, 12));
  for (std::size_t at = 2; at < good.size(); ++at) {
    std::string bad = good;
    bad[at] = static_cast<char>(~bad[at]);
    const auto picture = decode(bad, {20});
    EXPECT_TRUE(!picture || isWithinLimits(static_cast<std::uint64_t>(picture->frame->width),
                                           static_cast<std::uint64_t>(picture->frame->height)));
  }
}

}  // namespace
}  // namespace brivo::imaging
