// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "exif_bytes.h"
#include "reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::exifWithThumbnail;
using test::jpeg;
using test::jpegSegment;
using test::TiffBytes;

TEST(Jpeg, SizeAndDepthComeFromTheFrameHeader) {
  const auto found = readBasics(jpeg(4000, 3000));
  ASSERT_TRUE(found);
  EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
  EXPECT_EQ(found->depth, 8);
  EXPECT_EQ(found->orientation, 0);
  EXPECT_FALSE(found->thumbnail);
}

TEST(Jpeg, ExifIsReadInBothByteOrders) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const std::string file = jpeg(4000, 3000, exifSegment(exifWithThumbnail(order)));
    const auto found = readBasics(file);
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
    EXPECT_EQ(found->orientation, 6);
    EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
    EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
    EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
    EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
  }
}

TEST(Jpeg, ExifBehindOtherSegmentsAndBehindTheFrameHeaderIsFound) {
  const std::string exif = exifSegment(exifWithThumbnail(std::endian::little));
  const std::string other = jpegSegment(0xE0, "JFIF") + jpegSegment(0xE1, "http://ns.adobe.com/xap/1.0/");
  EXPECT_EQ(readBasics(jpeg(10, 20, other + exif))->orientation, 6);
  const std::string behind = "\xFF\xD8" + test::jpegFrame(10, 20) + exif + "\xFF\xD9";
  EXPECT_EQ(readBasics(behind)->orientation, 6);
}

TEST(Jpeg, TheFirstOfSeveralExifSegmentsCounts) {
  const std::string file = jpeg(10, 20,
                                exifSegment(exifWithThumbnail(std::endian::little, 3)) +
                                    exifSegment(exifWithThumbnail(std::endian::big, 8)));
  EXPECT_EQ(readBasics(file)->orientation, 3);
}

TEST(Jpeg, AnOrientationThatExifDoesNotKnowIsUpright) {
  EXPECT_EQ(readBasics(jpeg(10, 20, exifSegment(exifWithThumbnail(std::endian::little, 9))))->orientation, 1);
}

TEST(Jpeg, FillBytesBeforeMarkersAreSkipped) {
  EXPECT_EQ(readBasics(jpeg(10, 20, "\xFF\xFF\xFF" + jpegSegment(0xE0, "JFIF")))->size, (PixelSize{10, 20}));
  EXPECT_EQ(readBasics(jpeg(10, 20, std::string(100, '\xFF') + jpegSegment(0xE0, "JFIF")))->size,
            (PixelSize{10, 20}));
}

TEST(Jpeg, AThumbnailThatIsNoJpegOrLeavesTheFileIsNone) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0112, {1});
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, "no picture at all");
  EXPECT_FALSE(readBasics(jpeg(10, 20, exifSegment(tiff.build())))->thumbnail);

  TiffBytes outside;
  outside.beginDirectory();
  outside.shorts(0x0112, {1});
  outside.link(0, outside.beginDirectory());
  outside.offsetOf(0x0201, jpeg(160, 120));
  outside.longs(0x0202, {0xFFFFFFFF});
  EXPECT_FALSE(readBasics(jpeg(10, 20, exifSegment(outside.build())))->thumbnail);
}

TEST(Jpeg, TheOtherPicturesOfAMultiPictureFileAreEmbedded) {
  const auto segmentFor = [](std::uint64_t offset, std::uint64_t length) {
    TiffBytes mpf;
    mpf.beginDirectory();
    mpf.longs(0xB001, {2});
    std::string entries(16, '\0');
    entries +=
        test::integer(0, 4) + test::integer(length, 4) + test::integer(offset, 4) + test::integer(0, 4);
    mpf.undefined(0xB002, entries);
    return jpegSegment(0xE2, std::string("MPF\0", 4) + mpf.build());
  };
  const std::string second = jpeg(1620, 1080);
  const std::size_t before = jpeg(10, 20, segmentFor(0, 0)).size();
  constexpr std::size_t kStartOfBlock = 2 + 4 + 4;
  const std::string file = jpeg(10, 20, segmentFor(before - kStartOfBlock, second.size())) + second;
  const auto found = readPreviews(file);
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].offset, before);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{1620, 1080}));
}

TEST(Jpeg, TheThumbnailIsAnEmbeddedImageToo) {
  const std::string file = jpeg(4000, 3000, exifSegment(exifWithThumbnail(std::endian::little)));
  const auto found = readPreviews(file);
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].offset, found->thumbnail.offset);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{160, 120}));
  EXPECT_TRUE(readBasics(file)->embedded.empty());
}

TEST(Jpeg, AFlashPixStreamMayEndWithAPreview) {
  const std::string preview = jpeg(288, 192);
  const std::string stream = std::string("FPXR\0\0\2\0\1", 9) + "properties";
  const auto found = readPreviews(jpeg(10, 20, jpegSegment(0xE2, stream + preview)));
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{288, 192}));
  EXPECT_EQ(found->embedded[0].length, preview.size());
  const std::string continued = preview.substr(0, preview.size() - 1);
  EXPECT_TRUE(readPreviews(jpeg(10, 20, jpegSegment(0xE2, stream + continued)))->embedded.empty());
}

TEST(Jpeg, AThumbnailThatFewViewersShowIsNone) {
  const auto hasThumbnail = [](const std::string& thumbnail) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.shorts(0x0112, {1});
    tiff.link(0, tiff.beginDirectory());
    tiff.placed(0x0201, 0x0202, thumbnail);
    return bool(readBasics(jpeg(10, 20, exifSegment(tiff.build())))->thumbnail);
  };
  const auto changed = [](std::size_t place, char byte) {
    std::string thumbnail = jpeg(160, 120);
    thumbnail[place] = byte;
    return thumbnail;
  };
  EXPECT_TRUE(hasThumbnail(jpeg(160, 120)));
  EXPECT_TRUE(hasThumbnail(changed(3, '\xC2'))) << "progressive";
  EXPECT_TRUE(hasThumbnail(changed(11, 1))) << "grey";
  EXPECT_FALSE(hasThumbnail(changed(3, '\xC3'))) << "lossless";
  EXPECT_FALSE(hasThumbnail(changed(3, '\xC9'))) << "arithmetic coding";
  EXPECT_FALSE(hasThumbnail(changed(6, 12))) << "12 bits";
  EXPECT_FALSE(hasThumbnail(changed(11, 2))) << "two components";
}

TEST(Jpeg, JunkBetweenSegmentsIsSkipped) {
  const std::string comment = jpegSegment(0xFE, "comment");
  EXPECT_EQ(readBasics(jpeg(10, 20, comment + std::string("hello\xFF\0 there", 12)))->size,
            (PixelSize{10, 20}));
  EXPECT_EQ(readBasics(jpeg(10, 20, comment + std::string(2000, 'x')))->size, (PixelSize{10, 20}));
  CountingSource source("\xFF\xD8" + std::string(1'000'000, 'x'));
  EXPECT_FALSE(copySequentialProperties(source)->size);
  EXPECT_EQ(source.reads(), 1u);
}

TEST(Jpeg, SixteenKibibytesAreEnoughForAPictureWithItsThumbnail) {
  CountingSource source(jpeg(4000, 3000, exifSegment(exifWithThumbnail(std::endian::little))) +
                        std::string(1'000'000, 'x'));
  ASSERT_TRUE(copySequentialProperties(source));
  EXPECT_EQ(source.reads(), 1u);
  EXPECT_EQ(source.bytesRead(), 16'384u);
}

TEST(Jpeg, AFrameHeaderBehindLongSegmentsCostsAShortReadEach) {
  const std::string profile = jpegSegment(0xE2, std::string(60'000, 'i'));
  CountingSource source(
      jpeg(4000, 3000, exifSegment(exifWithThumbnail(std::endian::little)) + profile + profile));
  EXPECT_EQ(copySequentialProperties(source)->size, (PixelSize{4000, 3000}));
  EXPECT_LE(source.bytesRead(), 32'768u);
}

TEST(Jpeg, SegmentsWithoutEndAreGivenUp) {
  std::string segments;
  for (int i = 0; i < 100'000; ++i) segments += jpegSegment(0xE5, "");
  CountingSource source("\xFF\xD8" + segments);
  EXPECT_EQ(copySequentialProperties(source)->size, PixelSize());
  EXPECT_LE(source.bytesRead(), 65'536u);
}

TEST(Jpeg, EveryCutOfAFileGivesWhatIsLeft) {
  const std::string file = jpeg(4000, 3000, exifSegment(exifWithThumbnail(std::endian::big)));
  for (std::size_t length = 2; length < file.size(); ++length) {
    const auto found = readBasics(file.substr(0, length));
    ASSERT_TRUE(found) << length;
    EXPECT_TRUE(!found->thumbnail || found->thumbnail.offset + found->thumbnail.length <= length);
  }
}

}  // namespace
}  // namespace brivo::images
