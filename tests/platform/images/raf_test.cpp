// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "exif_bytes.h"
#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::exifWithThumbnail;
using test::jpeg;

constexpr std::size_t kHeader = 108;
constexpr std::uint16_t kFull = 0x100, kCropped = 0x111, kOutput = 0x121;

std::string big(std::uint64_t value, std::size_t width) {
  return test::integer(value, width, std::endian::big);
}

std::string entry(std::uint16_t tag, std::string_view value) {
  return big(tag, 2) + big(value.size(), 2) + std::string(value);
}

std::string size(std::uint16_t tag, std::uint32_t width, std::uint32_t height) {
  return entry(tag, big(height, 2) + big(width, 2));
}

std::string raf(std::string_view preview, std::uint32_t count, std::string_view entries) {
  std::string file = "FUJIFILMCCD-RAW 0201FF393101Camera";
  file.resize(84);
  file += big(kHeader, 4) + big(preview.size(), 4) + big(kHeader + preview.size(), 4) +
          big(4 + entries.size(), 4) + big(0, 8);
  return file + std::string(preview) + big(count, 4) + std::string(entries);
}

std::string preview() { return jpeg(1920, 1280, exifSegment(exifWithThumbnail(std::endian::little))); }

TEST(Raf, SizeIsThatOfTheRawImageAndNotOfItsPreview) {
  const auto found = readAll(raf(preview(), 1, size(kFull, 6000, 4000)));
  ASSERT_TRUE(found);
  EXPECT_EQ(found->size, (PixelSize{6000, 4000}));
  EXPECT_EQ(found->depth, 0);
}

TEST(Raf, TheCroppedSizeIsWhatIsDisplayed) {
  const std::string all = size(kFull, 6160, 4032) + entry(0x110, big(0, 4)) + size(kCropped, 6000, 4000) +
                          size(kOutput, 6032, 4028);
  EXPECT_EQ(readPreviews(raf(preview(), 4, all))->crop, (PixelSize{6000, 4000}));
  EXPECT_EQ(readPreviews(raf(preview(), 2, size(kFull, 6160, 4032) + size(kOutput, 6032, 4028)))->crop,
            (PixelSize{6032, 4028}));
}

TEST(Raf, LinesOfADiagonalSensorCountTwice) {
  EXPECT_EQ(readPreviews(raf(preview(), 1, size(kCropped, 4256, 1424)))->crop, (PixelSize{4256, 2848}));
}

TEST(Raf, ThePreviewHasTheExif) {
  const std::string file = raf(preview(), 1, size(kFull, 6000, 4000));
  const auto found = readAll(file);
  EXPECT_EQ(found->orientation, 6);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
}

TEST(Raf, ThePreviewAndItsThumbnailAreEmbedded) {
  const std::string file = raf(preview(), 1, size(kFull, 6000, 4000));
  const auto found = readPreviews(file);
  EXPECT_EQ(found->orientation, 6);
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{160, 120}));
  EXPECT_EQ(file.substr(found->embedded[0].offset, found->embedded[0].length), jpeg(160, 120));
  EXPECT_EQ(found->embedded[1].offset, kHeader);
  EXPECT_EQ(found->embedded[1].length, preview().size());
  EXPECT_EQ(found->embedded[1].size, (PixelSize{1920, 1280}));
}

TEST(Raf, AListThatLiesGivesWhatItHas) {
  EXPECT_EQ(readAll(raf(preview(), 0xFFFFFFFF, size(kFull, 6000, 4000)))->size, (PixelSize{6000, 4000}));
  EXPECT_EQ(readAll(raf(preview(), 2, entry(kFull, "ab") + size(kOutput, 6, 4)))->size, (PixelSize{6, 4}));
  EXPECT_EQ(readAll(raf(preview(), 0, size(kFull, 6000, 4000)))->size, PixelSize());
  EXPECT_EQ(readAll(raf(preview(), 1, big(kFull, 2) + big(0xFFFF, 2)))->size, PixelSize());
}

TEST(Raf, APreviewThatIsNoJpegIsNone) {
  const auto found = readPreviews(raf("no picture", 1, size(kFull, 6000, 4000)));
  ASSERT_TRUE(found);
  EXPECT_TRUE(found->embedded.empty());
  EXPECT_EQ(found->crop, (PixelSize{6000, 4000}));
}

TEST(Raf, FiveRangesAreEnoughWhereverThingsLie) {
  const std::string segments = exifSegment(exifWithThumbnail(std::endian::little)) +
                               test::jpegSegment(0xE2, std::string(60'000, 'p')) +
                               test::jpegSegment(0xE2, std::string(60'000, 'q'));
  const std::string large = jpeg(1920, 1280, segments) + std::string(3'000'000, 'd');
  const std::string file = raf(large, 1, size(kFull, 6000, 4000));
  expectSound(file);
  const auto found = readPreviews(file);
  EXPECT_EQ(found->crop, (PixelSize{6000, 4000}));
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->embedded[1].size, (PixelSize{1920, 1280}));
}

TEST(Raf, DamagedFilesAreReadSoundly) {
  const std::string file = raf(preview(), 2, size(kFull, 6000, 4000) + size(kCropped, 5000, 4000));
  expectCutsSound(file);
  expectHugeNumbersSound(file);
}

}  // namespace
}  // namespace brivo::images
