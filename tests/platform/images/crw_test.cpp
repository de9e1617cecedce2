// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <vector>

#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::integer;
using test::jpeg;

constexpr std::uint16_t kMakeAndModel = 0x080A, kCaptureTime = 0x180E, kImageInfo = 0x1810, kRawData = 0x2005,
                        kJpegImage = 0x2007, kThumbnail = 0x2008, kImageHeap = 0x300A, kCameraHeap = 0x2807;
constexpr std::uint32_t kHeader = 26;

struct Record {
  std::uint16_t type;
  std::string value;
};

/// A heap with the values, its directory, and the offset of that. Eight bytes are kept in the directory when
/// the type says so.
std::string heap(const std::vector<Record>& records, std::endian order = std::endian::little) {
  std::string values, directory = integer(records.size(), 2, order);
  for (const auto& [type, value] : records) {
    directory += integer(type, 2, order);
    if ((type & 0x4000) != 0) {
      directory += value;
      continue;
    }
    directory += integer(value.size(), 4, order) + integer(values.size(), 4, order);
    values += value;
  }
  return values + directory + integer(values.size(), 4, order);
}

std::string crw(std::string_view root, std::endian order = std::endian::little) {
  std::string header = (order == std::endian::little ? "II" : "MM") + integer(kHeader, 4, order) + "HEAPCCDR";
  header.resize(kHeader);
  return header + std::string(root);
}

std::string imageInfo(std::uint32_t width, std::uint32_t height, std::int32_t degrees,
                      std::endian order = std::endian::little) {
  return integer(width, 4, order) + integer(height, 4, order) + integer(0x3F800000, 4, order) +
         integer(static_cast<std::uint32_t>(degrees), 4, order) + integer(8, 4, order) +
         integer(24, 4, order) + integer(0x101, 4, order);
}

std::string photo(std::endian order = std::endian::little) {
  const std::string camera = heap({{kMakeAndModel, std::string("Canon\0Canon PowerShot X\0", 24)}}, order);
  const std::string facts = heap({{kImageInfo, imageInfo(3072, 2048, 90, order)},
                                  {kCaptureTime, integer(1642666404, 4, order) + integer(0, 8)},
                                  {kCameraHeap, camera}},
                                 order);
  return crw(heap({{kRawData, "the raw image"},
                   {kJpegImage, jpeg(1600, 1200)},
                   {kThumbnail, jpeg(160, 120)},
                   {kImageHeap, facts}},
                  order),
             order);
}

TEST(Crw, FactsAreReadFromHeapsInHeapsInBothByteOrders) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const auto found = readAll(photo(order));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{3072, 2048}));
    EXPECT_EQ(found->depth, 8);
    EXPECT_EQ(found->orientation, 6);
    EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Canon"));
    EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Model"), Value("Canon PowerShot X"));
    EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2022:01:20 08:13:24"));
  }
}

TEST(Crw, TheThumbnailIsTheSmallJpeg) {
  const std::string file = photo();
  const auto found = readBasics(file);
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
  EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
}

TEST(Crw, BothJpegsAreEmbedded) {
  const std::string file = photo();
  const auto found = readPreviews(file);
  EXPECT_EQ(found->crop, (PixelSize{3072, 2048}));
  EXPECT_EQ(found->orientation, 6);
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{1600, 1200}));
  EXPECT_EQ(file.substr(found->embedded[1].offset, found->embedded[1].length), jpeg(160, 120));
}

TEST(Crw, QuarterTurnsAreOrientations) {
  const auto orientationOf = [](std::int32_t degrees) {
    return readBasics(crw(heap({{kImageInfo, imageInfo(30, 20, degrees)}})))->orientation;
  };
  EXPECT_EQ(orientationOf(0), 1);
  EXPECT_EQ(orientationOf(90), 6);
  EXPECT_EQ(orientationOf(180), 3);
  EXPECT_EQ(orientationOf(270), 8);
  EXPECT_EQ(orientationOf(-90), 8);
  EXPECT_EQ(orientationOf(450), 6);
  EXPECT_EQ(orientationOf(45), 0);
  EXPECT_EQ(orientationOf(-0x7FFFFFFF - 1), 0);
}

TEST(Crw, ValuesOfEightBytesStandInTheDirectory) {
  const auto found = readBasics(crw(heap({{kCaptureTime | 0x4000, integer(1642666404, 4) + integer(0, 4)}})));
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2022:01:20 08:13:24"));
}

TEST(Crw, FactsThatAreMissingOrBadAreNone) {
  const auto found = readBasics(crw(heap({{kImageInfo, "short"},
                                          {kCaptureTime, integer(0, 12)},
                                          {kMakeAndModel, "no end"},
                                          {kThumbnail, "no picture"}})));
  ASSERT_TRUE(found);
  EXPECT_FALSE(*found);
}

TEST(Crw, ImagesAtTheStartOfALargeFileTakeFewRanges) {
  const std::string facts = heap({{kImageInfo, imageInfo(3072, 2048, 0)}});
  const CountingSource source(crw(heap({{kRawData, std::string(1'000'000, 'r')},
                                        {kJpegImage, jpeg(1600, 1200) + std::string(600'000, 'j')},
                                        {kThumbnail, jpeg(160, 120) + std::string(6000, 't')},
                                        {kImageHeap, facts}})));
  const auto found = copyContainerProperties(source);
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->crop, (PixelSize{3072, 2048}));
  EXPECT_LE(source.reads(), 4u);
}

TEST(Crw, AHeapThatHoldsItselfEnds) {
  // The directory stands at the start of the heap, and its records name the whole heap again.
  std::string directory = integer(1000, 2);
  const std::uint32_t length = 2 + 1000 * 10 + 4;
  for (int i = 0; i < 1000; ++i) directory += integer(kImageHeap, 2) + integer(length, 4) + integer(0, 4);
  expectSound(crw(directory + integer(0, 4)));
}

TEST(Crw, RecordsThatLeaveTheirHeapAreLeftOut) {
  std::string directory = integer(3, 2);
  directory += integer(kThumbnail, 2) + integer(0xFFFFFFFF, 4) + integer(0, 4);
  directory += integer(kThumbnail, 2) + integer(1, 4) + integer(0xFFFFFFFF, 4);
  directory += integer(kImageInfo, 2) + integer(28, 4) + integer(0, 4);
  const std::string info = imageInfo(30, 20, 0);
  const auto found = readBasics(crw(info + directory + integer(info.size(), 4)));
  EXPECT_EQ(found->size, (PixelSize{30, 20}));
  EXPECT_FALSE(found->thumbnail);
}

TEST(Crw, OtherHeapsAreNone) {
  EXPECT_FALSE(readBasics("II" + integer(26, 4) + "HEAPJPGM" + std::string(12, '\0')));
  EXPECT_FALSE(readBasics("IM" + integer(26, 4) + "HEAPCCDR" + std::string(12, '\0')));
}

TEST(Crw, DamagedFilesAreReadSoundly) {
  expectCutsSound(photo());
  expectHugeNumbersSound(photo());
}

}  // namespace
}  // namespace brivo::images
