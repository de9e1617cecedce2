// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "exif_bytes.h"
#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::exifWithThumbnail;
using test::integer;

std::string chunk(std::string_view type, std::string_view content) {
  return std::string(type) + integer(content.size(), 4) + std::string(content) +
         std::string(content.size() % 2, '\0');
}

std::string canvas(std::uint32_t width, std::uint32_t height) {
  return chunk("VP8X", integer(8, 4) + integer(width - 1, 3) + integer(height - 1, 3));
}

std::string lossy(std::uint32_t width, std::uint32_t height) {
  return chunk("VP8 ", integer(0, 3) + "\x9D\x01\x2A" + integer(width, 2) + integer(height, 2) + "picture");
}

std::string lossless(std::uint32_t width, std::uint32_t height) {
  return chunk("VP8L", "\x2F" + integer((width - 1) | (height - 1) << 14, 4) + "picture");
}

std::string webp(std::string_view chunks) {
  return "RIFF" + integer(chunks.size() + 4, 4) + "WEBP" + std::string(chunks);
}

TEST(Webp, SizeComesFromTheCanvasOrFromTheFrameHeader) {
  for (const std::string& chunks :
       {lossy(4000, 3000), lossless(4000, 3000), canvas(4000, 3000) + lossy(16, 16),
        canvas(4000, 3000) + lossless(16, 16)}) {
    const auto found = readBasics(webp(chunks));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
    EXPECT_EQ(found->depth, 8);
  }
}

TEST(Webp, TheLargestSizesFit) {
  EXPECT_EQ(readBasics(webp(canvas(1 << 24, 1 << 24)))->size, (PixelSize{1 << 24, 1 << 24}));
  EXPECT_EQ(readBasics(webp(lossless(16'384, 16'384)))->size, (PixelSize{16'384, 16'384}));
}

TEST(Webp, TheScaleOfALossyFrameIsNoPartOfItsSize) {
  EXPECT_EQ(readBasics(webp(lossy(4000 | 1 << 14, 3000 | 2 << 14)))->size, (PixelSize{4000, 3000}));
}

TEST(Webp, ExifIsReadWithAndWithoutItsSignature) {
  for (const std::string& signature : {std::string(), std::string("Exif\0\0", 6)}) {
    const std::string exif = chunk("EXIF", signature + exifWithThumbnail(std::endian::little));
    const std::string file = webp(canvas(40, 30) + chunk("ICCP", "odd") + lossy(40, 30) + exif);
    const auto found = readBasics(file);
    ASSERT_TRUE(found);
    EXPECT_EQ(found->orientation, 6);
    EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
    EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), test::jpeg(160, 120));
  }
}

TEST(Webp, FramesWithoutTheirSignatureHaveNoSize) {
  for (const std::string& chunks : {chunk("VP8 ", "0123456789"), chunk("VP8L", "0123456789"),
                                    chunk("VP8X", "short"), chunk("ALPH", "0123456789"), std::string()}) {
    const auto found = readBasics(webp(chunks));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, PixelSize());
    EXPECT_EQ(found->depth, 0);
  }
}

TEST(Webp, OtherRiffFilesAreNone) {
  EXPECT_FALSE(readBasics("RIFF" + integer(4, 4) + "WAVE"));
  EXPECT_FALSE(readBasics("RIFF" + integer(4, 4) + "WEB"));
}

TEST(Webp, ChunksWithoutEndAreGivenUp) {
  std::string chunks = canvas(40, 30);
  for (int i = 0; i < 100'000; ++i) chunks += chunk("ANMF", "12");
  expectSound(webp(chunks));
}

TEST(Webp, DamagedFilesAreReadSoundly) {
  const std::string file =
      webp(canvas(40, 30) + lossy(40, 30) + chunk("EXIF", exifWithThumbnail(std::endian::big)));
  expectCutsSound(file);
  expectHugeNumbersSound(file);
}

}  // namespace
}  // namespace brivo::images
