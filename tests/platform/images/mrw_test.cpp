// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "exif_bytes.h"
#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::exifWithThumbnail;
using test::integer;
using test::jpeg;
using test::TiffBytes;

std::string block(std::string_view letters, std::string_view content, std::endian order) {
  return '\0' + std::string(letters) + integer(content.size(), 4, order) + std::string(content);
}

std::string sizes(std::uint32_t width, std::uint32_t height, std::endian order) {
  return block("PRD",
               "27230003" + integer(height + 8, 2, order) + integer(width + 8, 2, order) +
                   integer(height, 2, order) + integer(width, 2, order) + "\x10\x0C" +
                   std::string("\x59\0\0\0\1\0", 6),
               order);
}

std::string mrw(std::string_view tiff, std::endian order = std::endian::big) {
  const std::string blocks =
      sizes(3264, 2448, order) + block("TTW", tiff, order) + block("WBG", "balance", order);
  const std::string signature = order == std::endian::big ? "MRM" : "MRI";
  return '\0' + signature + integer(blocks.size(), 4, order) + blocks + "the raw image";
}

/// EXIF whose maker note names `preview`, which lies behind the note.
std::string exifWithPreview(std::string_view preview) {
  const auto built = [&](std::uint32_t previewAt) {
    const auto big = [](std::uint64_t value, std::size_t width) {
      return integer(value, width, std::endian::big);
    };
    TiffBytes tiff(std::endian::big);
    tiff.beginDirectory();
    tiff.directory(0x8769, 1);
    tiff.beginDirectory();
    tiff.ascii(0x9003, "2004:11:18 23:14:58");
    tiff.undefined(0x927C, big(2, 2) + big(0x88, 2) + big(4, 2) + big(1, 4) + big(previewAt, 4) +
                               big(0x89, 2) + big(4, 2) + big(1, 4) + big(preview.size(), 4) + big(0, 4));
    return tiff.build();
  };
  const auto end = static_cast<std::uint32_t>(built(0).size());
  return built(end) + std::string(preview);
}

TEST(Mrw, SizeAndDepthComeFromTheirBlockInBothByteOrders) {
  for (const auto order : {std::endian::big, std::endian::little}) {
    const auto found = readAll(mrw(exifWithThumbnail(std::endian::big), order));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{3264, 2448}));
    EXPECT_EQ(found->crop, (PixelSize{3264, 2448}));
    EXPECT_EQ(found->depth, 12);
  }
}

TEST(Mrw, OffsetsCountFromTheStartOfTheTiffBlock) {
  const std::string file = mrw(exifWithThumbnail(std::endian::big));
  const auto found = readAll(file);
  EXPECT_EQ(found->orientation, 6);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
  const auto previews = readPreviews(file);
  ASSERT_EQ(previews->embedded.size(), 1u);
  EXPECT_EQ(previews->embedded[0].offset, found->thumbnail.offset);
  EXPECT_EQ(previews->embedded[0].size, (PixelSize{160, 120}));
}

TEST(Mrw, ThePreviewOfTheMakerNoteIsFound) {
  const std::string file = mrw(exifWithPreview(jpeg(640, 480)));
  const auto found = readBasics(file);
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2004:11:18 23:14:58"));
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(640, 480));
  const auto previews = readPreviews(file);
  ASSERT_EQ(previews->embedded.size(), 1u);
  EXPECT_EQ(previews->embedded[0].size, (PixelSize{640, 480}));
}

TEST(Mrw, APreviewThatIsNoJpegIsNone) {
  EXPECT_FALSE(readBasics(mrw(exifWithPreview("no picture")))->thumbnail);
  EXPECT_TRUE(readPreviews(mrw(exifWithPreview("no picture")))->embedded.empty());
}

TEST(Mrw, BlocksBehindTheEndOfTheHeaderAreNotRead) {
  const std::string tiff = block("TTW", exifWithThumbnail(std::endian::big), std::endian::big);
  const auto found = readAll(std::string("\0MRM\0\0\0\0", 8) + tiff);
  ASSERT_TRUE(found);
  EXPECT_FALSE(*found);
}

TEST(Mrw, BlocksWithoutEndAreGivenUp) {
  std::string blocks;
  for (int i = 0; i < 100'000; ++i) blocks += block("PAD", "", std::endian::big);
  expectSound(std::string("\0MRM\xFF\xFF\xFF\xFF", 8) + blocks);
}

TEST(Mrw, DamagedFilesAreReadSoundly) {
  for (const std::string& file : {mrw(exifWithThumbnail(std::endian::little)),
                                  mrw(exifWithPreview(jpeg(640, 480)), std::endian::little)}) {
    expectCutsSound(file);
    expectHugeNumbersSound(file);
  }
}

}  // namespace
}  // namespace brivo::images
