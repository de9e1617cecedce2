// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "reading.h"

namespace brivo::images {
namespace {

using test::jpeg;
using test::TiffBytes;

void imageOf(TiffBytes& tiff, unsigned width, unsigned height, unsigned bits = 8) {
  tiff.longs(0x0100, {width});
  tiff.longs(0x0101, {height});
  tiff.shorts(0x0102, {bits, bits, bits});
}

/// A picture taken with a camera, and a thumbnail.
std::string picture(std::endian order, bool big = false) {
  TiffBytes tiff(order, big);
  tiff.beginDirectory();
  imageOf(tiff, 4000, 3000, 16);
  tiff.ascii(0x010F, "Maker");
  tiff.shorts(0x0112, {8});
  tiff.directory(0x8769, 1);
  tiff.directory(0x8825, 2);
  tiff.beginDirectory();
  tiff.ascii(0x9003, "2021:06:01 10:00:00");
  tiff.beginDirectory();
  tiff.bytes(0x0000, {2, 3, 0, 0});
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  return tiff.build();
}

TEST(Tiff, BothByteOrdersAndBothOffsetWidthsAreRead) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    for (const bool big : {false, true}) {
      const std::string file = picture(order, big);
      const auto found = readAll(file);
      ASSERT_TRUE(found);
      EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
      EXPECT_EQ(found->depth, 16);
      EXPECT_EQ(found->orientation, 8);
      EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
      EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
      EXPECT_TRUE(found->entries.has(ExifGroup::gps));
      EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
      EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
    }
  }
}

TEST(Tiff, PlacesAreReadInTheFullCallOnly) {
  EXPECT_FALSE(readBasics(picture(std::endian::little))->entries.has(ExifGroup::gps));
}

TEST(Tiff, OneRangeIsEnoughForASmallFileInEveryCall) {
  for (const auto call : {copySequentialProperties, copyImageProperties, copyContainerProperties}) {
    CountingSource source(picture(std::endian::little));
    EXPECT_EQ(call(source)->size, (PixelSize{4000, 3000}));
    EXPECT_EQ(source.reads(), 1u);
  }
}

TEST(Tiff, TheFirstPageIsTheImageThoughAnotherIsLarger) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 10, 10);
  tiff.link(0, tiff.beginDirectory());
  imageOf(tiff, 20, 20);
  const auto found = readPreviews(tiff.build());
  EXPECT_EQ(found->size, (PixelSize{10, 10}));
  EXPECT_FALSE(found->crop) << "a plain TIFF has none";
}

TEST(Tiff, AReducedFirstImageGivesWayToTheLargestFullOne) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.longs(0x00FE, {1});
  imageOf(tiff, 160, 120);
  tiff.directories(0x014A, {1, 2, 3});
  tiff.beginDirectory();
  tiff.longs(0x00FE, {0});
  imageOf(tiff, 2000, 1500, 12);
  tiff.beginDirectory();
  tiff.longs(0x00FE, {0});
  imageOf(tiff, 4000, 3000, 14);
  tiff.beginDirectory();
  tiff.longs(0x00FE, {4});  // a mask
  imageOf(tiff, 8000, 6000, 1);
  const auto found = readBasics(tiff.build());
  EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
  EXPECT_EQ(found->depth, 14);
}

TEST(Tiff, AFileOfReducedImagesOnlyHasTheSizeOfTheFirst) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.longs(0x00FE, {1});
  imageOf(tiff, 160, 120);
  EXPECT_EQ(readBasics(tiff.build())->size, (PixelSize{160, 120}));
}

TEST(Tiff, EveryFinishedJpegIsEmbedded) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 32, 32);
  tiff.shorts(0x0103, {7});
  tiff.placed(0x0111, 0x0117, jpeg(32, 32));
  tiff.directory(0x014A, 1);
  tiff.beginDirectory();
  tiff.placed(0x0201, 0x0202, jpeg(64, 48));
  tiff.shorts(0x0112, {3});
  tiff.link(1, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(640, 480));
  const std::string file = tiff.build();
  const auto found = readPreviews(file);
  ASSERT_EQ(found->embedded.size(), 3u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{32, 32}));
  EXPECT_EQ(found->embedded[0].orientation, 0);
  EXPECT_EQ(found->embedded[1].size, (PixelSize{64, 48}));
  EXPECT_EQ(found->embedded[1].orientation, 3);
  EXPECT_EQ(found->embedded[2].size, (PixelSize{640, 480}));
  EXPECT_EQ(file.substr(found->embedded[2].offset, found->embedded[2].length), jpeg(640, 480));
  EXPECT_TRUE(readAll(file)->embedded.empty()) << "nobody asked";
}

TEST(Tiff, StripsThatAreNoJpegByThemselvesAreNotEmbedded) {
  const auto embedded = [](unsigned compression, unsigned bits, std::string strip) {
    TiffBytes tiff;
    tiff.beginDirectory();
    imageOf(tiff, 32, 32, bits);
    tiff.shorts(0x0103, {compression});
    tiff.placed(0x0111, 0x0117, std::move(strip));
    return readPreviews(tiff.build())->embedded.size();
  };
  EXPECT_EQ(embedded(7, 8, jpeg(32, 32)), 1u);
  EXPECT_EQ(embedded(6, 8, jpeg(32, 32)), 1u);
  EXPECT_EQ(embedded(1, 8, jpeg(32, 32)), 0u);
  EXPECT_EQ(embedded(7, 16, jpeg(32, 32)), 0u);
  EXPECT_EQ(embedded(7, 8, "uncompressed samples"), 0u);
}

TEST(Tiff, AnImageInSeveralStripsIsNoFinishedJpeg) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 32, 32);
  tiff.shorts(0x0103, {7});
  tiff.longs(0x0111, {8, 8});
  tiff.longs(0x0117, {20, 20});
  EXPECT_TRUE(readPreviews(tiff.build())->embedded.empty());
}

TEST(Tiff, AFrameHeaderBehindWhatMayBeFetchedLeavesTheStatedSize) {
  std::string segments;
  for (int i = 0; i < 8; ++i) segments += test::jpegSegment(0xE5, std::string(60'000, 'x'));
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 32, 32);
  tiff.shorts(0x0103, {7});
  tiff.placed(0x0111, 0x0117, jpeg(33, 33, segments));
  CountingSource source(tiff.build());
  const auto found = copyContainerProperties(source);
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{32, 32}));
  EXPECT_LE(source.reads(), 5u);
  EXPECT_LE(source.bytesRead(), 262'144u);
}

TEST(Tiff, ASecondDirectoryThatCannotBeReadGivesNoThumbnail) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 10, 20);
  tiff.directory(0x014A, 1);
  tiff.link(0, 0);
  tiff.beginDirectory();
  tiff.placed(0x0201, 0x0202, jpeg(1600, 1200));
  const auto found = readPreviews(tiff.build());
  EXPECT_EQ(found->embedded.size(), 1u);
  EXPECT_FALSE(found->thumbnail);
}

TEST(Tiff, DirectoriesInACircleEnd) {
  for (const bool big : {false, true}) {
    TiffBytes tiff(std::endian::little, big);
    tiff.beginDirectory();
    imageOf(tiff, 10, 20);
    tiff.directories(0x014A, {0, 1});
    tiff.link(0, tiff.beginDirectory());
    imageOf(tiff, 30, 40);
    tiff.directories(0x014A, {0, 1});
    tiff.link(1, 0);
    EXPECT_EQ(readBasics(tiff.build())->size, (PixelSize{10, 20}));
  }
}

TEST(Tiff, OffsetsOfZeroNameNoDirectory) {
  // The header, read as a directory, would have so many entries that none were left for others.
  const std::string behind(100'000, 'x');
  TiffBytes inner;
  inner.beginDirectory();
  inner.longs(0x00FE, {1});
  inner.raw(0x014A, 4, 2, test::integer(0, 4) + test::integer(8 + 30, 4));
  inner.beginDirectory();
  imageOf(inner, 4000, 3000);
  EXPECT_EQ(readBasics(inner.build() + behind)->size, (PixelSize{4000, 3000}));

  TiffBytes exif;
  exif.beginDirectory();
  exif.longs(0x8769, {0});
  exif.directory(0x8825, 1);
  exif.beginDirectory();
  exif.bytes(0x0000, {2, 3, 0, 0});
  EXPECT_TRUE(readAll(exif.build() + behind)->entries.has(ExifGroup::gps));
}

TEST(Tiff, SubdirectoriesWithoutNumberAreGivenUp) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 10, 20);
  tiff.raw(0x014A, 4, 0xFFFFFFFF, test::integer(8, 4));
  tiff.link(0, tiff.beginDirectory());
  tiff.raw(0x014A, 4, 50'000, std::string(200'000, '\x10'));
  CountingSource source(tiff.build());
  EXPECT_EQ(copyImageProperties(source)->size, (PixelSize{10, 20}));
  EXPECT_LE(source.reads(), 5u);
}

TEST(Tiff, JpegsThatOverlapTheHeaderOrLeaveTheFileAreNone) {
  TiffBytes tiff;
  tiff.beginDirectory();
  imageOf(tiff, 10, 20);
  tiff.longs(0x0201, {0});
  tiff.longs(0x0202, {100});
  tiff.link(0, tiff.beginDirectory());
  tiff.offsetOf(0x0201, jpeg(30, 40));
  tiff.longs(0x0202, {0xFFFFFFFF});
  tiff.link(1, tiff.beginDirectory());
  tiff.longs(0x0201, {0xFFFFFFF0});
  tiff.longs(0x0202, {0x20});
  const auto found = readPreviews(tiff.build());
  EXPECT_TRUE(found->embedded.empty());
  EXPECT_FALSE(found->thumbnail);
}

TEST(Tiff, OtherBytesAreNot) {
  EXPECT_FALSE(readBasics(""));
  EXPECT_FALSE(readBasics("II"));
  EXPECT_FALSE(readBasics(std::string("II\x2B\0\x08\0", 6)));
  EXPECT_FALSE(readBasics(std::string("IM\x2A\0\x08\0\0\0\0\0", 10)));
  EXPECT_FALSE(readBasics(TiffBytes().build(41)));
}

TEST(Tiff, EveryCutOfAFileGivesWhatIsLeft) {
  for (const bool big : {false, true}) {
    const std::string file = picture(std::endian::big, big);
    for (std::size_t length = 16; length < file.size(); ++length) {
      const auto found = readPreviews(file.substr(0, length));
      ASSERT_TRUE(found) << length;
      for (const EmbeddedImage& image : found->embedded) EXPECT_LE(image.offset + image.length, length);
      EXPECT_TRUE(!found->size || found->size == (PixelSize{4000, 3000})) << length;
    }
  }
}

}  // namespace
}  // namespace brivo::images
