// SPDX-License-Identifier: MIT
// Thumbnails of files with real pictures.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "content/recording_device.h"
#include "imaging/made_pictures.h"
#include "platform/images/image_reader.h"
#include "support/image_bytes.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/log.h"

namespace brivo {
namespace {

using test::madeJpeg;
using test::withExifThumbnail;
using testing::ContainsRegex;

class ThumbnailsTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> add(const std::string& name, const std::string& content) {
    test::writeFile(card / name, content);
    return BrivoFile::initWithFSURL(card / name, name, nullptr, *device);
  }
  /// The reply, which must come once.
  static Dictionary ask(BrivoFile& file, std::optional<std::uint32_t> width) {
    Dictionary options;
    if (width) options.set("OVThumbnailMaxPixelSize", *width);
    std::vector<Dictionary> replies;
    file.thumbnailDataWithOptions(options, [&](Dictionary reply) { replies.push_back(std::move(reply)); });
    EXPECT_EQ(replies.size(), 1u);
    return replies.at(0);
  }
  static std::string textOf(const Data* data) { return data ? std::string(data->text()) : std::string(); }
  static images::PixelSize sizeOf(const Data& jpeg) {
    const auto properties = images::copySequentialProperties(images::MemorySource(jpeg.bytes()));
    return properties ? properties->size : images::PixelSize();
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  const std::string small = madeJpeg(160, 120);
};

TEST_F(ThumbnailsTest, AnEmbeddedThumbnailOf160PixelsAnswersWithItsBytesUnchanged) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small));
  const test::StandardErrorCapture log;
  const Dictionary reply = ask(*file, 160);
  EXPECT_EQ(textOf(reply.data("thumb")), small);
  EXPECT_NE(log.text().find("[subImage]  validated: ["), std::string::npos) << log.text();
}

TEST_F(ThumbnailsTest, ALargerOneThanAnyEmbeddedIsDecodedAndEncodedAnew) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small));
  const Dictionary reply = ask(*file, 1024);
  ASSERT_TRUE(reply.data("thumb"));
  EXPECT_EQ(sizeOf(*reply.data("thumb")).width, 1024u);
  EXPECT_EQ(sizeOf(*reply.data("thumb")).height, 768u);
}

TEST_F(ThumbnailsTest, ASubImageThatIsNoJpegLogsInvalidAndIsDecodedInstead) {
  const auto file = add("IMG_0001.JPG", madeJpeg(1600, 1200));
  const SubImage image{100, 500, 160, 120};
  file->addSubImageDict(*file->rawImageValidateSubImage(&image));
  const test::StandardErrorCapture log;
  const Dictionary reply = ask(*file, 160);
  EXPECT_NE(log.text().find("[subImage]    invalid: [       500(b)@        100(o)]"), std::string::npos)
      << log.text();
  ASSERT_TRUE(reply.data("thumb"));
  EXPECT_EQ(sizeOf(*reply.data("thumb")).height, 120u);
}

TEST_F(ThumbnailsTest, ASubImageThatEndsBeyondTheFileIsSkippedWithoutALine) {
  for (const std::uint32_t offset : {50'000'000U, 0xFFFFFFF0U}) {  // the second one's end wraps around
    const auto file = add("IMG_0001.JPG", madeJpeg(1600, 1200));
    const SubImage image{offset, 500, 160, 120};
    file->addSubImageDict(*file->rawImageValidateSubImage(&image));
    const test::StandardErrorCapture log;
    const Dictionary reply = ask(*file, 160);
    EXPECT_EQ(log.text().find("validated"), std::string::npos);
    EXPECT_EQ(log.text().find("invalid"), std::string::npos);
    ASSERT_TRUE(reply.data("thumb"));
    EXPECT_EQ(sizeOf(*reply.data("thumb")).width, 160u) << "decoded";
  }
}

TEST_F(ThumbnailsTest, WithoutASizeTheSmallestSubImageIsUsed) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small));
  EXPECT_EQ(textOf(ask(*file, std::nullopt).data("thumb")), small);
}

TEST_F(ThumbnailsTest, WithoutASizeAndASubImageThePictureKeepsItsSize) {
  const auto file = add("IMG_0001.JPG", madeJpeg(320, 240));
  const Dictionary reply = ask(*file, std::nullopt);
  ASSERT_TRUE(reply.data("thumb"));
  EXPECT_EQ(sizeOf(*reply.data("thumb")).width, 320u);
}

TEST_F(ThumbnailsTest, TheOrientationOfTheMetadataComesWithTheThumbnail) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small, 6));
  const Dictionary reply = ask(*file, 160);
  EXPECT_EQ(reply.unsignedInteger("Orientation"), 6u);
  ASSERT_TRUE(reply.dictionary("metadata"));
  EXPECT_EQ(textOf(reply.data("thumb")), small) << "and the picture is as it was";
}

TEST_F(ThumbnailsTest, AFileWithOrientation0GetsNoOrientation) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small, 6));
  file->setImageOrientation(0);
  const Dictionary reply = ask(*file, 160);
  EXPECT_FALSE(reply.contains("Orientation"));
  EXPECT_TRUE(reply.dictionary("metadata")->contains("Orientation"));
}

TEST_F(ThumbnailsTest, ACorruptPictureKeepsItsMetadataAndHasNoThumb) {
  std::string broken = withExifThumbnail(madeJpeg(1600, 1200), "no JPEG at all");
  broken.resize(broken.size() / 2);
  const auto file = add("IMG_0001.JPG", broken);
  const Dictionary reply = ask(*file, 160);
  EXPECT_FALSE(reply.contains("thumb"));
  EXPECT_TRUE(reply.contains("metadata"));
}

TEST_F(ThumbnailsTest, FilesWithoutAPictureAnswerWithNothing) {
  for (const char* name : {"IMG_0001.JPG", "IMG_0002.PNG", "IMG_0003.NEF", "IMG_0004.TXT", "IMG_0005.HEIC"}) {
    for (const std::string& content : {std::string(), std::string("no picture"), std::string(5000, '\xFF')}) {
      EXPECT_FALSE(ask(*add(name, content), 160).contains("thumb")) << name;
    }
  }
}

TEST_F(ThumbnailsTest, ANameThatLiesIsNotBelieved) {
  const Dictionary reply = ask(*add("IMG_0001.PNG", madeJpeg(320, 240)), 160);
  ASSERT_TRUE(reply.data("thumb"));
  EXPECT_EQ(sizeOf(*reply.data("thumb")).width, 160u);
}

TEST_F(ThumbnailsTest, AFileThatIsGoneHasNoThumb) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small));
  std::filesystem::remove(card / "IMG_0001.JPG");
  EXPECT_FALSE(ask(*file, 160).contains("thumb"));
  EXPECT_FALSE(ask(*file, 1024).contains("thumb"));
}

TEST_F(ThumbnailsTest, TheFileIsClosedAfterEveryRequest) {
  const auto file = add("IMG_0001.JPG", withExifThumbnail(madeJpeg(1600, 1200), small));
  for (const std::uint32_t width : {160U, 1024U}) {
    ask(*file, width);
    EXPECT_EQ(file->fileOpenCount(), 0u);
  }
}

TEST_F(ThumbnailsTest, TheResponseIsLoggedWithItsLengthAndTime) {
  const auto file = add("IMG_0001.TXT", "text");
  const test::StandardErrorCapture log;
  ask(*file, 160);
  EXPECT_NE(log.text().find("[subImage]   response: [         0b]"), std::string::npos) << log.text();
  EXPECT_THAT(log.text(),
              ContainsRegex("\\[subImage\\]   response: \\[         0b\\]   \\[ +[0-9]+ ms\\] \\{𝚫\\}"));
}

TEST_F(ThumbnailsTest, TheSidecarsWholeContentIsAThumbnail) {
  test::writeFile(card / "100ABCDE/IMG_0001.THM", small);
  test::writeFile(card / "100ABCDE/IMG_0001.JPG", madeJpeg(320, 240));
  // The folder's path must end with a separator, because none is put in.
  const auto folder = BrivoFolder::initWithFSURL(card / "100ABCDE/", "100ABCDE", nullptr, *device);
  device->addCameraFolderToIndex(folder);
  const auto file =
      BrivoFile::initWithFSURL(card / "100ABCDE/IMG_0001.JPG", "IMG_0001.JPG", folder.get(), *device);
  OVLoggingLevel = kLogTypeContent;
  const test::StandardErrorCapture log;
  const auto thumbnail = file->thumbnailDataUsingSidecarFiles();
  ASSERT_TRUE(thumbnail);
  EXPECT_EQ(thumbnail->text(), small);
  OVLoggingLevel = 0;
  EXPECT_NE(log.text().find("  ✓             [IMG_0001.JPG] thumbnail using sidecar file"),
            std::string::npos);
  std::filesystem::remove(card / "100ABCDE/IMG_0001.THM");
  EXPECT_FALSE(file->thumbnailDataUsingSidecarFiles());
}

TEST_F(ThumbnailsTest, ImageDataIsTheWholeFile) {
  const std::string content = madeJpeg(640, 480);
  const auto data = add("IMG_0001.JPG", content)->imageData();
  ASSERT_TRUE(data);
  EXPECT_EQ(data->text(), content);
  EXPECT_FALSE(add("IMG_0002.JPG", "")->imageData());
}

TEST_F(ThumbnailsTest, TheOffsetsOfTheExifThumbnailAreNotGivenOut) {
  EXPECT_FALSE(BrivoFile::exifThumbOffsets());
}

}  // namespace
}  // namespace brivo
