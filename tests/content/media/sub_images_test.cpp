// SPDX-License-Identifier: MIT
#include "content/media/sub_images.h"

#include <gtest/gtest.h>

#include "content/recording_device.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

SubImage ofWidth(std::uint32_t width, std::uint32_t offset = 1000) {
  return {offset, 500, width, width * 3 / 4};
}

class SubImagesTest : public testing::Test {
 protected:
  SubImagesTest() {
    test::writeFile(card / "IMG_0001.TXT", "");
    file = BrivoFile::initWithFSURL(card / "IMG_0001.TXT", "IMG_0001.TXT", nullptr, *device);
  }
  void add(const SubImage& image) { file->addSubImageDict(*file->rawImageValidateSubImage(&image)); }
  std::uint32_t widthFor(std::uint32_t wanted) {
    const auto found = file->subImageDictForPixelWidth(wanted);
    return found ? found->ImageWidth : 0;
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  std::shared_ptr<BrivoFile> file;
};

TEST_F(SubImagesTest, ARequestGetsTheNarrowestImageThatIsWideEnough) {
  for (const std::uint32_t width : {1616u, 160u, 1024u}) add(ofWidth(width));
  EXPECT_EQ(widthFor(200), 1024u);
  EXPECT_EQ(widthFor(160), 160u);
  EXPECT_EQ(widthFor(1616), 1616u);
  EXPECT_EQ(widthFor(2000), 0u) << "none is wide enough";
  EXPECT_EQ(widthFor(0), 160u);
}

TEST_F(SubImagesTest, WidthsAreComparedAsSignedNumbers) {
  add(ofWidth(160));
  EXPECT_EQ(widthFor(0xFFFFFFFF), 160u) << "-1 is less than any width";
}

TEST_F(SubImagesTest, ASizeOfTheDecodersNamesIsTaken) {
  const Dictionary description{{"JPEGOffset", 1000}, {"JPEGLength", 500}, {"Width", 1616}, {"Height", 1080}};
  const SubImage image = SubImage::fromDictionary(description);
  const auto validated = file->rawImageValidateSubImage(&image);
  ASSERT_TRUE(validated);
  EXPECT_EQ(validated->ImageWidth, 1616u);
  EXPECT_EQ(validated->ImageHeight, 1080u);
  EXPECT_EQ(nameOfSubImageType(validated->imageType), "previewImage");
  EXPECT_TRUE(file->previewThumbnail());
  EXPECT_FALSE(file->smallThumbnail());
}

TEST_F(SubImagesTest, AnImageSizeComesBeforeTheDecodersNames) {
  const SubImage image = SubImage::fromDictionary(
      {{"ImageWidth", 640}, {"ImageHeight", 480}, {"Width", 1616}, {"Height", 1080}, {"Orientation", 6}});
  EXPECT_EQ(image, (SubImage{0, 0, 640, 480, 6}));
}

TEST_F(SubImagesTest, NumbersThatDoNotFitCountAsZero) {
  EXPECT_EQ(SubImage::fromDictionary({{"JPEGOffset", std::uint64_t{1} << 32}, {"Orientation", 65'536}}),
            SubImage());
}

TEST_F(SubImagesTest, AWidthBetweenTheClassesHasNoneAndSetsNoFlag) {
  for (const std::uint32_t width : {1280u, 1025u, 1399u}) {
    const SubImage image = ofWidth(width);
    const auto validated = file->rawImageValidateSubImage(&image);
    ASSERT_TRUE(validated);
    EXPECT_EQ(validated->imageType, SubImageType::none);
    EXPECT_EQ(nameOfSubImageType(validated->imageType), "");
  }
  EXPECT_FALSE(file->smallThumbnail());
  EXPECT_FALSE(file->previewThumbnail());
}

TEST_F(SubImagesTest, ClassesBeginAndEndWhereTheyShould) {
  EXPECT_EQ(subImageTypeForWidth(1), SubImageType::ptpSubThumbnailImage);
  EXPECT_EQ(subImageTypeForWidth(159), SubImageType::ptpSubThumbnailImage);
  EXPECT_EQ(subImageTypeForWidth(160), SubImageType::smallThumbnail);
  EXPECT_EQ(subImageTypeForWidth(1024), SubImageType::ptpSubThumbnailImage);
  EXPECT_EQ(subImageTypeForWidth(1400), SubImageType::previewImage);
  EXPECT_EQ(nameOfSubImageType(SubImageType::ptpSubThumbnailImage), "ptpSubThumbnailImage");
  EXPECT_EQ(nameOfSubImageType(SubImageType::smallThumbnail), "smallThumbnail");
}

TEST_F(SubImagesTest, AWidthOf160BecomesTheThumbnailOfTheDataset) {
  add({2048, 777, 320, 240});
  EXPECT_EQ(file->thumbOffset(), 0u);
  EXPECT_TRUE(file->smallThumbnail());
  add({1000, 500, 160, 120});
  EXPECT_EQ(file->thumbOffset(), 1000u);
  EXPECT_EQ(file->thumbSize(), 500u);
  EXPECT_EQ(file->thumbWidth(), 160u);
  EXPECT_EQ(file->thumbHeight(), 120u);
}

TEST_F(SubImagesTest, ADescriptionWithoutOffsetOrLengthIsGivenWithItsError) {
  for (const SubImage& image : {SubImage{0, 500, 160, 120}, SubImage{1000, 0, 160, 120}}) {
    Error error;
    const auto validated = file->rawImageValidateSubImage(&image, &error);
    EXPECT_EQ(validated, image);
    EXPECT_EQ(error.code, -4);
    EXPECT_EQ(error.domain, "org.orvid.brivo");
  }
  EXPECT_FALSE(file->smallThumbnail());
}

TEST_F(SubImagesTest, ADescriptionWithoutASizeIsNone) {
  for (const SubImage& image :
       {SubImage{1000, 500, 0, 0}, SubImage{1000, 500, 160, 0}, SubImage{1000, 500, 0, 120}}) {
    Error error;
    EXPECT_EQ(file->rawImageValidateSubImage(&image, &error), std::nullopt);
    EXPECT_EQ(error.code, -2);
    EXPECT_EQ(file->rawImageValidateSubImage(&image), std::nullopt) << "an error need not be asked for";
  }
  EXPECT_EQ(file->rawImageValidateSubImage(nullptr), std::nullopt);
}

TEST_F(SubImagesTest, OfTwoImagesOfOneWidthTheFirstIsKept) {
  add(ofWidth(160, 1000));
  add(ofWidth(160, 2000));
  ASSERT_EQ(file->subImages().all().size(), 1u);
  EXPECT_EQ(file->subImageDictForPixelWidth(160)->JPEGOffset, 1000u);
}

TEST_F(SubImagesTest, ItemsAreOrderedByHandle) {
  test::writeFile(card / "IMG_0002.TXT", "");
  const auto later = BrivoFile::initWithFSURL(card / "IMG_0002.TXT", "IMG_0002.TXT", nullptr, *device);
  EXPECT_EQ(BrivoFile::compare(*file, *later, nullptr), -1);
  EXPECT_EQ(BrivoFile::compare(*later, *file, nullptr), 1);
  EXPECT_EQ(BrivoFile::compare(*file, *file, nullptr), 0);
}

}  // namespace
}  // namespace brivo
