// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::jpeg;
using test::TiffBytes;

constexpr unsigned kColorFilterArray = 32803;
constexpr unsigned kLinearRaw = 34892;

void sensorOf(TiffBytes& tiff, unsigned width, unsigned height, unsigned bits) {
  tiff.longs(0x00FE, {0});
  tiff.longs(0x0100, {width});
  tiff.longs(0x0101, {height});
  tiff.shorts(0x0102, {bits});
  tiff.shorts(0x0106, {kColorFilterArray});
  tiff.placed(0x0111, 0x0117, "sensor data");
}

void reducedOf(TiffBytes& tiff, unsigned width, unsigned height) {
  tiff.longs(0x00FE, {1});
  tiff.longs(0x0100, {width});
  tiff.longs(0x0101, {height});
  tiff.shorts(0x0102, {8, 8, 8});
}

/// Lossless JPEG, as raw files keep sensor data in: SOF3, 14 bits, two components.
std::string losslessJpeg() {
  const std::string frame("\x0E\x0B\xB8\x0F\xA0\x02\1\x11\0\2\x11\0", 12);
  return "\xFF\xD8" + test::jpegSegment(0xC4, "table") + test::jpegSegment(0xC3, frame) + "\xFF\xD9";
}

std::string thumbnailIn(const std::string& file, const std::optional<ImageProperties>& found) {
  return file.substr(found->thumbnail.offset, found->thumbnail.length);
}

TEST(Raw, ASensorBehindAReducedImageAndAJpegBesideItAsInNef) {
  TiffBytes tiff(std::endian::big);
  tiff.beginDirectory();
  reducedOf(tiff, 160, 120);
  tiff.shorts(0x0112, {6});
  tiff.directories(0x014A, {1, 2});
  tiff.beginDirectory();
  tiff.longs(0x00FE, {1});
  tiff.placed(0x0201, 0x0202, jpeg(4928, 3264));
  tiff.shorts(0x0112, {1});
  tiff.beginDirectory();
  sensorOf(tiff, 4948, 3280, 14);
  const std::string file = tiff.build();
  const auto found = readPreviews(file);
  EXPECT_EQ(found->size, (PixelSize{4948, 3280}));
  EXPECT_EQ(found->crop, (PixelSize{4948, 3280}));
  EXPECT_EQ(found->depth, 14);
  EXPECT_EQ(found->orientation, 6);
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{4928, 3264}));
  EXPECT_EQ(found->embedded[0].orientation, 1);
}

TEST(Raw, WithoutAnExifThumbnailTheSmallestJpegIsOne) {
  TiffBytes tiff;
  tiff.beginDirectory();
  sensorOf(tiff, 4000, 3000, 12);
  tiff.directories(0x014A, {1, 2});
  tiff.beginDirectory();
  tiff.placed(0x0201, 0x0202, jpeg(4000, 3000, test::jpegSegment(0xE5, "more bytes")));
  tiff.beginDirectory();
  tiff.placed(0x0201, 0x0202, jpeg(640, 480));
  const std::string file = tiff.build();
  for (const auto& found : {readBasics(file), readAll(file), readPreviews(file)}) {
    EXPECT_EQ(thumbnailIn(file, found), jpeg(640, 480));
    EXPECT_EQ(found->thumbnail.size, (PixelSize{640, 480}));
  }
  EXPECT_TRUE(readBasics(file)->embedded.empty());
}

TEST(Raw, TheJpegOfTheSecondDirectoryIsTheThumbnailAsInArw) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.longs(0x00FE, {1});
  tiff.placed(0x0201, 0x0202, jpeg(16, 12));
  tiff.directory(0x014A, 1);
  tiff.beginDirectory();
  sensorOf(tiff, 6024, 4024, 14);
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120, test::jpegSegment(0xE5, "more bytes")));
  const std::string file = tiff.build();
  const auto found = readPreviews(file);
  EXPECT_EQ(found->size, (PixelSize{6024, 4024}));
  EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
  EXPECT_EQ(found->embedded.size(), 2u);
}

/// CR2: a JPEG in a strip, a thumbnail, an uncompressed image, the raw data.
std::string canonRaw() {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0100, {5472});
  tiff.shorts(0x0101, {3648});
  tiff.shorts(0x0102, {8, 8, 8});
  tiff.shorts(0x0103, {6});
  tiff.placed(0x0111, 0x0117, jpeg(5472, 3648, test::jpegSegment(0xE5, "more bytes")));
  tiff.shorts(0x0112, {8});
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  tiff.link(1, tiff.beginDirectory());
  tiff.shorts(0x0100, {592});
  tiff.shorts(0x0101, {395});
  tiff.shorts(0x0102, {16, 16, 16});
  tiff.shorts(0x0103, {6});
  tiff.placed(0x0111, 0x0117, "uncompressed samples");
  tiff.link(2, tiff.beginDirectory());
  tiff.shorts(0x0103, {6});
  tiff.placed(0x0111, 0x0117, losslessJpeg());
  std::string file = tiff.build(42, 8);
  return file.replace(8, 4, std::string("CR\2\0", 4));
}

TEST(Raw, TheRawDataOfCr2IsNoPreview) {
  const std::string file = canonRaw();
  const auto found = readPreviews(file);
  EXPECT_EQ(found->size, (PixelSize{5472, 3648}));
  EXPECT_EQ(found->crop, (PixelSize{5472, 3648}));
  EXPECT_EQ(found->orientation, 8);
  EXPECT_EQ(thumbnailIn(file, found), jpeg(160, 120));
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{160, 120}));
  EXPECT_EQ(found->embedded[1].size, (PixelSize{5472, 3648}));
  EXPECT_EQ(found->embedded[1].orientation, 8);
}

TEST(Raw, EveryCutOfACr2GivesWhatIsLeft) {
  const std::string file = canonRaw();
  for (std::size_t length = 16; length < file.size(); ++length) {
    const auto found = readPreviews(file.substr(0, length));
    ASSERT_TRUE(found) << length;
    for (const EmbeddedImage& image : found->embedded) EXPECT_LE(image.offset + image.length, length);
  }
}

TEST(Raw, LosslessJpegIsSensorDataWhereverItLies) {
  TiffBytes tiff;
  tiff.beginDirectory();
  sensorOf(tiff, 4000, 3000, 14);
  tiff.placed(0x0201, 0x0202, losslessJpeg());
  EXPECT_TRUE(readPreviews(tiff.build())->embedded.empty());
}

TEST(Raw, AStripWithSensorDataIsNoPreviewThoughItIsAJpeg) {
  for (const unsigned interpretation : {kColorFilterArray, kLinearRaw}) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.longs(0x0100, {4000});
    tiff.longs(0x0101, {3000});
    tiff.shorts(0x0102, {8});
    tiff.shorts(0x0103, {7});
    tiff.shorts(0x0106, {interpretation});
    tiff.placed(0x0111, 0x0117, jpeg(4000, 3000));
    EXPECT_TRUE(readPreviews(tiff.build())->embedded.empty());
  }
}

TEST(Raw, TheMagicNumbersOfOrfCount) {
  for (const std::uint16_t magic : {0x4F52, 0x5352}) {
    for (const auto order : {std::endian::little, std::endian::big}) {
      TiffBytes tiff(order);
      tiff.beginDirectory();
      tiff.longs(0x0100, {4640});
      tiff.longs(0x0101, {3472});
      const auto found = readPreviews(tiff.build(magic));
      ASSERT_TRUE(found);
      EXPECT_EQ(found->crop, (PixelSize{4640, 3472}));
    }
  }
}

/// RW2: borders on the sensor, and a whole JPEG with its own EXIF and thumbnail.
std::string panasonicRaw() {
  TiffBytes exif;
  exif.beginDirectory();
  exif.directory(0x8769, 1);
  exif.beginDirectory();
  exif.ascii(0x9003, "2021:06:01 10:00:00");
  exif.link(0, exif.beginDirectory());
  exif.placed(0x0201, 0x0202, jpeg(160, 120));
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0002, {4816});
  tiff.shorts(0x0003, {3464});
  tiff.shorts(0x0004, {8});
  tiff.shorts(0x0005, {10});
  tiff.shorts(0x0006, {3464});
  tiff.shorts(0x0007, {4626});
  tiff.shorts(0x000A, {12});
  tiff.undefined(0x002E, jpeg(1920, 1440, exifSegment(exif.build())));
  tiff.shorts(0x0112, {3});
  return tiff.build(0x0055);
}

TEST(Raw, Rw2HasItsSizeFromTheBordersAndTheRestFromItsJpeg) {
  const std::string file = panasonicRaw();
  for (const auto& found : {readAll(file), readPreviews(file)}) {
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{4616, 3456}));
    EXPECT_EQ(found->crop, (PixelSize{4616, 3456}));
    EXPECT_EQ(found->depth, 12);
    EXPECT_EQ(found->orientation, 3);
    EXPECT_EQ(thumbnailIn(file, found), jpeg(160, 120));
  }
  EXPECT_EQ(readAll(file)->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
  const auto found = readPreviews(file);
  ASSERT_EQ(found->embedded.size(), 2u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{160, 120}));
  EXPECT_EQ(found->embedded[1].size, (PixelSize{1920, 1440}));
}

TEST(Raw, BordersTheWrongWayRoundAreNone) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0004, {3464});
  tiff.shorts(0x0005, {10});
  tiff.shorts(0x0006, {8});
  tiff.shorts(0x0007, {4626});
  EXPECT_FALSE(readPreviews(tiff.build(0x0055))->size);
}

TEST(Raw, DngStatesTheDisplayedSizeInAnyType) {
  enum class Form { shorts, longs, rationals, zeroDenominators };
  const auto found = [](Form form) {
    TiffBytes tiff;
    tiff.beginDirectory();
    reducedOf(tiff, 160, 120);
    tiff.directory(0x014A, 1);
    tiff.beginDirectory();
    sensorOf(tiff, 2672, 1968, 10);
    if (form == Form::shorts) tiff.shorts(0xC620, {2592, 1944});
    if (form == Form::longs) tiff.longs(0xC620, {2592, 1944});
    if (form == Form::rationals) tiff.rationals(0xC620, {{2592, 1}, {3888, 2}});
    if (form == Form::zeroDenominators) tiff.rationals(0xC620, {{2592, 0}, {1944, 0}});
    return readPreviews(tiff.build());
  };
  for (const Form form : {Form::shorts, Form::longs, Form::rationals}) {
    EXPECT_EQ(found(form)->crop, (PixelSize{2592, 1944}));
    EXPECT_EQ(found(form)->size, (PixelSize{2672, 1968}));
  }
  EXPECT_EQ(found(Form::zeroDenominators)->crop, (PixelSize{2672, 1968}));
}

TEST(Raw, TheFirstCamerasOfSonyHaveTheSizeInABlockOfMinolta) {
  const auto found = [](std::string_view model) {
    const std::string sizes =
        test::integer(2608, 2) + test::integer(3880, 2) + test::integer(2592, 2) + test::integer(3872, 2);
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.ascii(0x0110, model);
    tiff.longs(0x00FE, {1});
    tiff.directory(0x014A, 1);
    tiff.directory(0xC634, 2);
    tiff.beginDirectory();
    sensorOf(tiff, 3880, 2600, 12);
    tiff.beginDirectory();
    tiff.undefined(0x7250, std::string("\0MRI\x20\0\0\0\0PRD\x18\0\0\0", 16) + "21870002" + sizes);
    return readPreviews(tiff.build());
  };
  EXPECT_EQ(found("DSLR-A100")->size, (PixelSize{3872, 2592}));
  EXPECT_EQ(found("DSLR-A100")->crop, (PixelSize{3872, 2592}));
  EXPECT_EQ(found("ILCE-7")->size, (PixelSize{3880, 2600}));
}

TEST(Raw, ADirectoryRightBeforeAnotherCostsNoRange) {
  TiffBytes tiff;
  tiff.beginDirectory();
  sensorOf(tiff, 4000, 3000, 14);
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.ascii(0x9003, "2021:06:01 10:00:00");
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  std::string file = tiff.build(42, 100'000);
  // The header names a copy of the first directory at its start.
  const std::size_t entries = 8 + 100'000;
  file.replace(8, 200, file, entries, 200);
  file.replace(4, 4, test::integer(8, 4));
  CountingSource source(file);
  const auto found = copyImageProperties(source);
  EXPECT_TRUE(found->entries.has(ExifGroup::exif));
  EXPECT_TRUE(found->thumbnail);
  EXPECT_EQ(source.reads(), 2u);
}

TEST(Raw, PreviewsAllOverALargeFileStayWithinTheLimits) {
  TiffBytes tiff;
  tiff.beginDirectory();
  sensorOf(tiff, 4000, 3000, 14);
  std::size_t last = 0;
  const std::string filler(100'000, 'x');
  for (unsigned i = 1; i <= 20; ++i) {
    const std::size_t next = tiff.beginDirectory();
    tiff.link(last, next);
    last = next;
    tiff.placed(0x0201, 0x0202, jpeg(i, i) + filler);
  }
  CountingSource source(tiff.build());
  const auto found = copyContainerProperties(source);
  EXPECT_EQ(found->embedded.size(), 5u) << "the first one lies in the first range";
  EXPECT_EQ(source.reads(), 5u);
  EXPECT_LE(source.bytesRead(), 262'144u);
}

}  // namespace
}  // namespace brivo::images
