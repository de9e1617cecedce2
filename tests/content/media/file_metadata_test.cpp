// SPDX-License-Identifier: MIT
// Metadata and catalogue facts of files with real bytes.
#include <gtest/gtest.h>

#include <filesystem>

#include "content/recording_device.h"
#include "support/image_bytes.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/dates.h"
#include "util/log.h"

namespace brivo {
namespace {

using test::exifSegment;
using test::jpeg;
using test::TiffBytes;

/// What the made-up EXIF blocks of these tests may hold.
struct ExifTexts {
  const char* original = nullptr;
  const char* digitized = nullptr;
  const char* ofExif = nullptr;
  const char* ofTiff = nullptr;
  unsigned orientation = 0;
  std::string_view makerNote = {};
  bool thumbnail = false;
};

std::string exif(const ExifTexts& texts) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  if (texts.orientation != 0) tiff.shorts(0x0112, {texts.orientation});
  if (texts.ofTiff) tiff.ascii(0x0132, texts.ofTiff);
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  if (texts.ofExif) tiff.ascii(0x0132, texts.ofExif);
  if (texts.original) tiff.ascii(0x9003, texts.original);
  if (texts.digitized) tiff.ascii(0x9004, texts.digitized);
  if (!texts.makerNote.empty()) tiff.undefined(0x927C, texts.makerNote);
  tiff.ascii(0xA434, "Lens");
  if (texts.thumbnail) {
    tiff.link(0, tiff.beginDirectory());
    tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  }
  return tiff.build();
}

std::string picture(const ExifTexts& texts, unsigned width = 4000, unsigned height = 3000) {
  return jpeg(width, height, exifSegment(exif(texts)));
}

/// A raw-like TIFF: a full size in the first directory, a preview and a thumbnail.
std::string rawFile(unsigned orientation) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.longs(0x00FE, {0});
  tiff.longs(0x0100, {6000});
  tiff.longs(0x0101, {4000});
  tiff.shorts(0x0112, {orientation});
  tiff.directory(0x014A, 1);
  tiff.beginDirectory();
  tiff.placed(0x0201, 0x0202, jpeg(1620, 1080));
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  return tiff.build();
}

class FileMetadataTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> make(const std::string& name, const std::string& content) {
    test::writeFile(card / name, content);
    return BrivoFile::initWithFSURL(card / name, name, nullptr, *device);
  }
  static Dictionary request(BrivoFile& file) {
    Dictionary answer;
    int answers = 0;
    file.metadataWithOptions({}, [&](Dictionary result) {
      answer = std::move(result);
      ++answers;
    });
    EXPECT_EQ(answers, 1);
    return answer;
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
};

TEST_F(FileMetadataTest, AJpgHasItsFactsWhenItIsMade) {
  const test::StandardErrorCapture log;
  const std::string content = picture({.orientation = 1, .thumbnail = true});
  const auto file = make("IMG_0001.JPG", content);
  EXPECT_NE(log.text().find("------> Load  jpg ------>"), std::string::npos) << "the fast path";
  EXPECT_NE(log.text().find("CopyMetadataFromSequentialDataProviderCallbacks   ["), std::string::npos);
  EXPECT_EQ(file->type(), kTypeImage);
  EXPECT_TRUE(file->hasMetadata());
  EXPECT_TRUE(file->hasThumbnail());
  EXPECT_TRUE(file->updatedBasicMetadata());
  EXPECT_EQ(file->imageWidth(), 4000u);
  EXPECT_EQ(file->imageHeight(), 3000u);
  EXPECT_EQ(file->imageOrientation(), 1u);
  EXPECT_EQ(content.substr(file->thumbOffset(), file->thumbSize()), jpeg(160, 120));
  EXPECT_EQ(file->thumbWidth(), 160u);
  EXPECT_EQ(file->thumbHeight(), 120u);
  EXPECT_TRUE(file->smallThumbnail());
  EXPECT_EQ(file->subImageDictForPixelWidth(100)->JPEGOffset, file->thumbOffset());
}

TEST_F(FileMetadataTest, AJpegBuildsTheFullDictionaryInTheBasicPass) {
  const test::StandardErrorCapture log;
  const auto file = make("IMG_0001.jpeg", picture({.orientation = 1, .thumbnail = true}));
  EXPECT_EQ(log.text().find("------> Load"), std::string::npos);
  EXPECT_TRUE(file->updatedBasicMetadata());
  EXPECT_TRUE(file->updatedExpensiveMetadata());
  EXPECT_EQ(file->imageWidth(), 4000u);
  EXPECT_EQ(file->thumbWidth(), 160u);
  EXPECT_EQ(*file->metadata()->dictionary("{Exif}")->string("LensModel"), "Lens");
}

TEST_F(FileMetadataTest, ADateTimeOfExifAloneOverwritesTheOriginalDate) {
  const auto file =
      make("IMG_0001.JPG", picture({.original = "2021:06:01 10:00:00", .ofExif = "2021:06:02 11:00:00"}));
  EXPECT_EQ(file->exifCreationDateTime(), "2021:06:02 11:00:00");
  EXPECT_EQ(file->exifModificationDateTime(), std::nullopt);
  EXPECT_EQ(file->exifCreationDate(), OVStandardDateFromString("2021:06:02 11:00:00"));
  EXPECT_EQ(file->exifModificationDate(), std::nullopt);
}

TEST_F(FileMetadataTest, CreationAndModificationDatesComeFromWhereTheyAreStatedFirst) {
  const auto all = make("IMG_0001.JPG", picture({.original = "2021:06:01 10:00:00",
                                                 .digitized = "2021:06:02 10:00:00",
                                                 .ofExif = "2021:06:03 10:00:00",
                                                 .ofTiff = "2021:06:04 10:00:00"}));
  EXPECT_EQ(all->exifCreationDateTime(), "2021:06:01 10:00:00");
  EXPECT_EQ(all->exifModificationDateTime(), "2021:06:02 10:00:00");
  const auto some =
      make("IMG_0002.JPG", picture({.ofExif = "2021:06:03 10:00:00", .ofTiff = "2021:06:04 10:00:00"}));
  EXPECT_EQ(some->exifCreationDateTime(), "2021:06:04 10:00:00");
  EXPECT_EQ(some->exifModificationDateTime(), "2021:06:04 10:00:00");
}

TEST_F(FileMetadataTest, AnOrientationOnItsSideSwapsTheSizes) {
  for (const unsigned orientation : {5u, 6u, 7u, 8u}) {
    const auto file = make("IMG_0001.JPG", picture({.orientation = orientation}));
    const Dictionary metadata = request(*file);
    EXPECT_EQ(file->imageOrientation(), orientation);
    EXPECT_EQ(file->imageWidth(), 3000u);
    EXPECT_EQ(file->imageHeight(), 4000u);
    EXPECT_EQ(metadata.unsignedInteger("Orientation"), orientation);
    for (const char* key : {"PixelWidth", "PixelXDimension"}) EXPECT_EQ(metadata.unsignedInteger(key), 3000u);
    for (const char* key : {"PixelHeight", "PixelYDimension"})
      EXPECT_EQ(metadata.unsignedInteger(key), 4000u);
  }
}

TEST_F(FileMetadataTest, AnOrientationOfTheTiffDictionaryOnlyCounts) {
  const auto file = make("IMG_0001.TXT", "");
  images::ImageProperties properties;
  properties.size = {4000, 3000};
  const std::string eight("\x08\0", 2);
  properties.entries.add(images::ExifGroup::tiff, 0x0112, 3, std::as_bytes(std::span(eight)),
                         std::endian::little);
  EXPECT_TRUE(file->processMetadata(properties, true));
  EXPECT_EQ(file->imageOrientation(), 8u);
  EXPECT_EQ(file->imageWidth(), 3000u);
  EXPECT_EQ(file->metadata()->unsignedInteger("Orientation"), 8u);
  EXPECT_EQ(file->metadata()->unsignedInteger("PixelWidth"), 3000u);
}

TEST_F(FileMetadataTest, PropertiesWithoutAnOrientationGive1) {
  const auto file = make("IMG_0001.JPG", jpeg(4000, 3000));
  EXPECT_EQ(file->imageOrientation(), 1u);
  EXPECT_FALSE(request(*file).contains("Orientation"));
  EXPECT_EQ(OVGetDimensionsFromImageProperties({}).orientation, 1);
}

TEST_F(FileMetadataTest, DimensionsAreLookedUpInTheirOrder) {
  const ImageDimensions raw = OVGetDimensionsFromImageProperties({{"PixelXDimension", 1},
                                                                  {"PixelWidth", 2},
                                                                  {"RawPixelWidth", 3},
                                                                  {"PixelYDimension", 4},
                                                                  {"PixelHeight", 5},
                                                                  {"Orientation", 3}});
  EXPECT_EQ(raw.width, 3u);
  EXPECT_EQ(raw.height, 5u);
  EXPECT_EQ(raw.orientation, 3);
  EXPECT_EQ(OVGetDimensionsFromImageProperties({}).width, std::nullopt);
}

TEST_F(FileMetadataTest, ADictionaryOfAnImageOnItsSideIsRewritten) {
  const auto file = make("IMG_0001.TXT", "");
  Dictionary properties{{"PixelWidth", 4000}, {"PixelHeight", 3000}, {"Orientation", 6}};
  file->setSizeAndOrientationFromImageProperties(properties);
  EXPECT_EQ(file->imageWidth(), 3000u);
  EXPECT_EQ(file->imageHeight(), 4000u);
  EXPECT_EQ(properties.unsignedInteger("PixelWidth"), 3000u);
  EXPECT_EQ(properties.unsignedInteger("PixelHeight"), 4000u);
  EXPECT_EQ(properties.unsignedInteger("PixelXDimension"), 3000u);
  EXPECT_EQ(properties.unsignedInteger("PixelYDimension"), 4000u);
}

TEST_F(FileMetadataTest, AMakerNoteWithManyEntriesKeepsOnlyEntry17) {
  std::string note("Maker note\0\0\1MM", 15);
  note += test::integer(2, 2, std::endian::big);
  for (const unsigned tag : {8u, 17u}) {
    note += test::integer(tag, 2, std::endian::big) + test::integer(2, 2, std::endian::big) +
            test::integer(4, 4, std::endian::big) + std::string("8C5\0", 4);
  }
  note += std::string(4, '\0');
  const auto file = make("IMG_0001.JPG", picture({.makerNote = note}));
  const Dictionary metadata = request(*file);
  ASSERT_NE(metadata.dictionary("{MakerNorel}"), nullptr);
  EXPECT_EQ(*metadata.dictionary("{MakerNorel}"), (Dictionary{{"17", "8C5"}}));
}

TEST_F(FileMetadataTest, AnImageWithoutExifHasNoMetadata) {
  const auto file = make("IMG_0001.jpeg", jpeg(4000, 3000));
  EXPECT_FALSE(file->hasMetadata());
  EXPECT_TRUE(file->updatedExpensiveMetadata());
  EXPECT_TRUE(file->hasThumbnail()) << "it can still be decoded";
  EXPECT_TRUE(request(*file).empty());
  EXPECT_EQ(file->metadata(), Dictionary()) << "built, and empty";
}

TEST_F(FileMetadataTest, ASecondRequestDoesNotTouchTheFile) {
  const auto file = make("IMG_0001.JPG", picture({.original = "2021:06:01 10:00:00", .orientation = 6}));
  const Dictionary first = request(*file);
  EXPECT_EQ(*first.dictionary("{Exif}")->string("DateTimeOriginal"), "2021:06:01 10:00:00");
  EXPECT_EQ(*first.dictionary("{TIFF}")->string("Make"), "Maker");
  EXPECT_EQ(first.unsignedInteger("Depth"), 8u);
  std::filesystem::remove(card / "IMG_0001.JPG");
  EXPECT_EQ(request(*file), first);
}

TEST_F(FileMetadataTest, BytesThatAreNoPictureLeaveTheDatasetAlone) {
  const auto file = make("IMG_0001.JPG", "no picture at all");
  EXPECT_EQ(file->imageWidth(), 0u);
  EXPECT_EQ(file->imageOrientation(), 0u);
  EXPECT_EQ(file->thumbSize(), 1u);
  EXPECT_TRUE(file->hasThumbnail());
  EXPECT_TRUE(file->updatedBasicMetadata());
}

TEST_F(FileMetadataTest, APictureWithoutASizeIsMissingMetadata) {
  const std::string noFrame = "\xFF\xD8" + exifSegment(exif({.orientation = 1})) + "\xFF\xD9";
  const auto file = make("IMG_0001.JPG", noFrame);
  EXPECT_FALSE(file->hasMetadata());
  EXPECT_FALSE(file->updatedExpensiveMetadata()) << "cleared again by the basic pass";
  EXPECT_TRUE(request(*file).empty());
}

TEST_F(FileMetadataTest, ARawFileHasItsSizeOrientationAndPreviewsWhenItIsMade) {
  const test::StandardErrorCapture log;
  const std::string content = rawFile(6);
  const auto file = make("IMG_0001.NEF", content);
  EXPECT_NE(log.text().find("------> rawImageMinimumProperties ------>"), std::string::npos);
  EXPECT_NE(log.text().find("<------ rawImageMinimumProperties <------   ["), std::string::npos);
  EXPECT_EQ(file->imageWidth(), 4000u);
  EXPECT_EQ(file->imageHeight(), 6000u);
  EXPECT_EQ(file->imageOrientation(), 6u);
  EXPECT_EQ(file->thumbWidth(), 160u);
  EXPECT_EQ(content.substr(file->thumbOffset(), file->thumbSize()), jpeg(160, 120));
  ASSERT_EQ(file->subImages().all().size(), 2u);
  EXPECT_EQ(file->subImages().all()[1].imageType, SubImageType::previewImage);
  EXPECT_FALSE(file->updatedBasicMetadata()) << "that is for the first request";
}

TEST_F(FileMetadataTest, WhereSpeedIsWantedARawFileIsReadLater) {
  device->speedFirst = true;
  const auto file = make("IMG_0001.NEF", rawFile(1));
  EXPECT_EQ(file->imageWidth(), 0u);
  EXPECT_TRUE(file->subImages().all().empty());
  ASSERT_EQ(device->operations.size(), 1u);
  device->operations.front()();
  EXPECT_EQ(file->imageWidth(), 6000u);
  EXPECT_EQ(file->subImages().all().size(), 2u);
  make("IMG_0002.JPG", picture({}));
  EXPECT_EQ(device->operations.size(), 1u) << "other pictures are read at once";
}

TEST_F(FileMetadataTest, ARawFileThatCannotBeReadIsUprightAndHasNoPreviews) {
  const auto file = make("IMG_0001.NEF", "no raw file at all");
  EXPECT_EQ(file->imageOrientation(), 1u);
  EXPECT_EQ(file->imageWidth(), 0u);
  EXPECT_TRUE(file->subImages().all().empty());
  EXPECT_TRUE(file->hasThumbnail());
}

}  // namespace
}  // namespace brivo
