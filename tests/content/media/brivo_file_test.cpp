// SPDX-License-Identifier: MIT
#include "content/media/brivo_file.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <limits>

#include "content/recording_device.h"
#include "platform/types/file_types.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

class BrivoFileTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> make(const std::string& name, std::string_view content = "") {
    test::writeFile(card / name, content);
    return BrivoFile::initWithFSURL(card / name, name, nullptr, *device);
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
};

TEST_F(BrivoFileTest, AJpegIsAnImageWithMetadataAndAThumbnail) {
  const auto file = make("IMG_0001.JPG");
  EXPECT_EQ(file->type(), kTypeImage);
  EXPECT_EQ(file->type(), 0x696D6167u);
  EXPECT_EQ(file->Tevo(), kGenericImageType);
  EXPECT_TRUE(file->hasMetadata());
  EXPECT_TRUE(file->hasThumbnail());
  EXPECT_TRUE(file->pixelorSupported());
  EXPECT_FALSE(file->rawImageSupported());
  EXPECT_EQ(make("IMG_0001.jpeg")->type(), kTypeImage);
}

TEST_F(BrivoFileTest, MoviesSoundsAndOthersByTheirExtensions) {
  const auto movie = make("clip.MOV");
  EXPECT_EQ(movie->type(), kTypeMovie);
  EXPECT_EQ(movie->Tevo(), kGenericMovieType);
  EXPECT_TRUE(movie->hasThumbnail());
  EXPECT_TRUE(movie->hasMetadata());
  const auto sound = make("memo.wav");
  EXPECT_EQ(sound->type(), kTypeAudio);
  EXPECT_FALSE(sound->hasThumbnail());
  EXPECT_FALSE(sound->hasMetadata());
  EXPECT_EQ(sound->thumbSize(), 0u);
  for (const char* name : {"notes.txt", "README", "trailing."}) {
    const auto other = make(name);
    EXPECT_EQ(other->type(), kTypeOther) << name;
    EXPECT_EQ(other->Tevo(), kGenericDataType);
    EXPECT_FALSE(other->hasThumbnail());
  }
}

TEST_F(BrivoFileTest, RawFilesAreRawButForTheExcludedExtensions) {
  for (const char* raw : {"IMG_0001.CR2", "IMG_0001.nef", "IMG_0001.ARW"}) {
    EXPECT_TRUE(make(raw)->rawImageSupported()) << raw;
    EXPECT_EQ(make(raw)->type(), kTypeImage);
  }
  for (const char* excluded :
       {"IMG_0001.DNG", "IMG_0001.3fr", "IMG_0001.TIF", "IMG_0001.raw", "IMG_0001.IIQ"}) {
    const auto file = make(excluded);
    EXPECT_FALSE(file->rawImageSupported()) << excluded;
    EXPECT_TRUE(file->pixelorSupported()) << "an image only because the decoders list it";
    EXPECT_EQ(file->type(), kTypeImage);
  }
  EXPECT_FALSE(BrivoFile::hasValidInformation("WAV"));
  EXPECT_FALSE(BrivoFile::hasValidInformation("dng"));
  EXPECT_TRUE(BrivoFile::hasValidInformation("cr2"));
  EXPECT_TRUE(BrivoFile::hasValidInformation(""));
}

TEST_F(BrivoFileTest, SetHasThumbnailKeepsTheDatasetHonest) {
  const auto file = make("IMG_0001.JPG");
  EXPECT_EQ(file->thumbSize(), 1u) << "a marker until the size is known";
  file->setThumbSize(8400);
  file->setHasThumbnail(true);
  EXPECT_EQ(file->thumbSize(), 8400u);
  file->setHasThumbnail(false);
  EXPECT_EQ(file->thumbSize(), 0u);
  file->setHasThumbnail(true);
  EXPECT_EQ(file->thumbSize(), 1u);
}

TEST_F(BrivoFileTest, ImageFieldsGoStraightToTheDataset) {
  const auto file = make("IMG_0001.JPG", "abc");
  file->setImageWidth(6000);
  file->setImageHeight(4000);
  file->setImageOrientation(0x10006);
  file->setThumbOffset(100);
  file->setThumbWidth(160);
  file->setThumbHeight(120);
  EXPECT_EQ(file->info().imagePixWidth(), 6000u);
  EXPECT_EQ(file->info().imagePixHeight(), 4000u);
  EXPECT_EQ(file->imageOrientation(), 6u) << "the low 16 bits";
  EXPECT_EQ(file->info().thumbOffset(), 100u);
  EXPECT_EQ(file->info().thumbPixWidth(), 160u);
  EXPECT_EQ(file->info().thumbPixHeight(), 120u);
  EXPECT_EQ(file->size(), 3u);
}

TEST(ValidateReturnDataSizeTest, OnlyAFullReadCounts) {
  constexpr auto most = std::numeric_limits<std::int64_t>::max();
  EXPECT_FALSE(BrivoFile::validateReturnDataSize(0, 0));
  EXPECT_FALSE(BrivoFile::validateReturnDataSize(most, most));
  EXPECT_TRUE(BrivoFile::validateReturnDataSize(4096, 4096));
  EXPECT_FALSE(BrivoFile::validateReturnDataSize(4095, 4096));
}

TEST_F(BrivoFileTest, AStreamOpenedTwiceAndClosedOnceStaysOpen) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  std::vector<std::byte> bytes(4);
  EXPECT_EQ(file->readStream(bytes, 0), 0) << "not open";
  EXPECT_TRUE(file->openStream());
  EXPECT_TRUE(file->openStream());
  EXPECT_EQ(file->fileOpenCount(), 2u);
  EXPECT_FALSE(file->closeStream());
  EXPECT_EQ(file->readStream(bytes, 2), 4);
  EXPECT_EQ(bytes[0], std::byte{'2'});
  EXPECT_TRUE(file->closeStream());
  EXPECT_EQ(file->readStream(bytes, 0), 0);
}

TEST_F(BrivoFileTest, AReadEndsWithTheSizeOfTheCatalogue) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  test::writeFile(card / "IMG_0001.JPG", std::string(100, 'x'));  // grew since
  ASSERT_TRUE(file->openStream());
  std::vector<std::byte> bytes(50);
  EXPECT_EQ(file->readStream(bytes, 4), 6);
  EXPECT_EQ(file->readStream(bytes, 10), 0);
  EXPECT_EQ(file->readStream(bytes, std::numeric_limits<std::uint64_t>::max()), 0);
  file->closeStream();
}

TEST_F(BrivoFileTest, AFileThatCannotBeOpenedCountsAsOpenAndItsReadsFail) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  std::filesystem::remove(card / "IMG_0001.JPG");
  std::vector<std::byte> bytes(4);
  EXPECT_TRUE(file->openStream());
  EXPECT_EQ(file->fileOpenCount(), 1u);
  EXPECT_EQ(file->readStream(bytes, 0), -1);
  EXPECT_TRUE(file->closeStream());
}

TEST_F(BrivoFileTest, WhileTheDeviceIsEjectedNothingIsOpenedOrRead) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  ASSERT_TRUE(file->openStream());
  device->ejected = true;
  std::vector<std::byte> bytes(4);
  EXPECT_FALSE(file->openStream());
  EXPECT_EQ(file->readStream(bytes, 0), 0);
  EXPECT_FALSE(file->closeStream());
}

TEST_F(BrivoFileTest, AFileIsMappedWhileItsStreamIsOpen) {
  const auto file = make("IMG_0001.CR2", std::string(5'000, 'x'));
  EXPECT_EQ(file->readMap(100, 0), nullptr);
  file->openStream();
  auto map = file->readMap(100, 4'500);
  ASSERT_TRUE(map);
  EXPECT_EQ(map->bytes()[99], std::byte{'x'});
  device->ejected = true;
  EXPECT_FALSE(file->closeMap(map));
  EXPECT_TRUE(map);
  device->ejected = false;
  EXPECT_TRUE(file->closeMap(map));
  EXPECT_FALSE(file->closeMap(map)) << "there is none any more";
}

TEST_F(BrivoFileTest, ABufferCacheReadsAheadInTheOpenStream) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  file->openStream();
  EXPECT_EQ(file->bufferCache(), nullptr);
  for (int i = 0; i < 2; ++i) {
    file->createBufferCache();
    std::uint64_t size = 0;
    EXPECT_EQ(file->bufferCache()->consumeBufferAtOffset(0, size)->text(), "0123456789");
    EXPECT_EQ(size, 10u);
  }
  file->destroyBufferCache();
  EXPECT_EQ(file->bufferCache(), nullptr);
}

TEST_F(BrivoFileTest, ACloseTooManyDoesNotUpsetTheNextReader) {
  const auto file = make("IMG_0001.JPG", "0123456789");
  EXPECT_FALSE(file->closeStream());
  EXPECT_TRUE(file->openStream());
  EXPECT_TRUE(file->closeStream());
}

}  // namespace
}  // namespace brivo
