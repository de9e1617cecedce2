// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include <filesystem>
#include <thread>

#include "orvidcore/client_test.h"

namespace orvid::test {
namespace {

using testing::IsEmpty;
using testing::SizeIs;

constexpr std::int32_t kBadRange = -21449;
constexpr std::int32_t kTooLong = -21446;
constexpr std::int32_t kNotDeleted = -9941;
constexpr std::int32_t kNoSuchObject = -21450;

using ObjectTest = ClientTest;

TEST_F(ObjectTest, RangesAreThoseOfTheFile) {
  const Object object = onlyFile("0123456789");
  EXPECT_EQ(object.read(0, 10)->text(), "0123456789");
  EXPECT_EQ(object.read(3, 4)->text(), "3456");
  EXPECT_EQ(object.read(9, 1)->text(), "9");
}

TEST_F(ObjectTest, ARangeOutsideTheObjectIsAnErrorWithItsCode) {
  const Object object = onlyFile("0123456789");
  const std::pair<std::uint64_t, std::uint64_t> ranges[] = {{10, 1},
                                                            {0, 11},
                                                            {9, 2},
                                                            {0, 0},
                                                            {11, 0},
                                                            {UINT64_MAX, 1},
                                                            {UINT64_MAX - 1, 3},
                                                            {1, UINT32_MAX / 2048}};
  for (const auto& [offset, length] : ranges) {
    const auto bytes = object.read(offset, length);
    EXPECT_EQ(codeOf(bytes), kBadRange) << offset << " " << length;
    ASSERT_FALSE(bytes.ok());
    EXPECT_FALSE(bytes.error().text.empty());
  }
}

TEST_F(ObjectTest, DataOfEveryFormArrivesWhole) {
  const std::string content = pattern(200'000);
  const Object object = onlyFile(content);
  for (const std::uint64_t length : {65'535, 65'536, 65'537, 200'000}) {
    const auto bytes = object.read(0, length);
    ASSERT_TRUE(bytes.ok()) << bytes.error().text;
    EXPECT_TRUE(bytes->text() == content.substr(0, length)) << length;
  }
  EXPECT_TRUE(object.read(100'000, 70'000)->text() == content.substr(100'000, 70'000));
}

TEST_F(ObjectTest, DataOutlivesEverythingElse) {
  const std::string content = pattern(100'000);
  auto bytes = onlyFile(content).read(0, 100'000);
  device.reset();
  browser.reset();
  ASSERT_TRUE(bytes.ok());
  EXPECT_TRUE(bytes->text() == content);
}

TEST_F(ObjectTest, OneReadIsAtMostFourMebibytes) {
  const std::string content = pattern(Object::kLongestRead + 5);
  const Object object = onlyFile(content);
  const auto longest = object.read(5, Object::kLongestRead);
  ASSERT_TRUE(longest.ok()) << longest.error().text;
  EXPECT_TRUE(longest->text() == content.substr(5));
  EXPECT_EQ(codeOf(object.read(0, Object::kLongestRead + 1)), kTooLong);
  EXPECT_EQ(codeOf(object.read(0, UINT64_MAX)), kTooLong);
}

TEST_F(ObjectTest, ReadingAsynchronouslyGivesTheSameBytesAndErrors) {
  const Object object = onlyFile("0123456789");
  Outcome<Data> good;
  Outcome<Data> outside;
  Outcome<Data> tooLong;
  object.readAsync(2, 3, good.callback());
  object.readAsync(2, 9, outside.callback());
  object.readAsync(0, Object::kLongestRead + 1, tooLong.callback());
  EXPECT_EQ(good.get()->text(), "234");
  EXPECT_EQ(codeOf(outside.get()), kBadRange);
  EXPECT_EQ(codeOf(tooLong.get()), kTooLong);
}

TEST_F(ObjectTest, AsynchronousReadsAreAnsweredInTheOrderOfAsking) {
  const Object object = onlyFile(pattern(1000));
  Recorder answered;
  std::vector<std::string> expected;
  for (std::uint64_t i = 0; i < 100; ++i) {
    object.readAsync(i, 1, [&answered, i](const Result<Data>& bytes) {
      answered.add(std::to_string(i) + (bytes.ok() ? "" : bytes.error().text));
    });
    expected.push_back(std::to_string(i));
  }
  ASSERT_TRUE(answered.waitFor("99"));
  EXPECT_EQ(answered.events(), expected);
}

TEST_F(ObjectTest, ManyThreadsMayCallAtOnce) {
  const std::string content = pattern(300'000);
  const Object object = onlyFile(content);
  std::atomic<int> right = 0;
  std::vector<std::thread> threads;
  for (std::uint64_t thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&, thread] {
      for (std::uint64_t i = 0; i < 20; ++i) {
        const std::uint64_t offset = thread * 1000 + i;
        const std::uint64_t length = i % 2 == 0 ? 100'000 : 10;
        const auto bytes = object.read(offset, length);
        right += bytes.ok() && bytes->text() == content.substr(offset, length) ? 1 : 0;
        right += device->object(object.info().handle) && browser->devices().ok() ? 1 : 0;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(right, 8 * 20 * 2);
}

TEST_F(ObjectTest, AFileThatIsNoPictureHasNoMetadataAndNoThumbnail) {
  service.addFile("CARD", "100ABCDE/IMG_0001.TXT", "words");
  const Object object = named(catalogueOfCard(), "IMG_0001.TXT");
  const auto metadata = object.metadata();
  ASSERT_TRUE(metadata.ok()) << metadata.error().text;
  EXPECT_TRUE(metadata->empty()) << brivo::describe(*metadata);
  const auto thumbnail = object.thumbnail(160);
  ASSERT_TRUE(thumbnail.ok()) << thumbnail.error().text;
  EXPECT_TRUE(thumbnail->empty()) << brivo::describe(*thumbnail);
  Outcome<Dictionary> laterMetadata;
  Outcome<Dictionary> laterThumbnail;
  object.metadataAsync(laterMetadata.callback());
  object.thumbnailAsync(160, laterThumbnail.callback());
  EXPECT_EQ(*laterMetadata.get(), *metadata);
  EXPECT_EQ(*laterThumbnail.get(), *thumbnail);
}

TEST_F(ObjectTest, ARemovedFileIsGoneFromTheCardAndFromTheCatalogue) {
  const Object object = onlyFile("x");
  const std::uint32_t handle = object.info().handle;
  const auto removed = object.remove();
  ASSERT_TRUE(removed.ok()) << removed.error().text;
  EXPECT_FALSE(std::filesystem::exists(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG"));
  EXPECT_FALSE(device->object(handle));
  EXPECT_THAT(catalogueOfCard(), SizeIs(2)) << "the two folders";
}

TEST_F(ObjectTest, WhatIsRemovedAlreadyIsRemovedWithSuccessButCannotBeAskedForAnything) {
  const Object object = onlyFile("x");
  ASSERT_TRUE(object.remove().ok());
  EXPECT_TRUE(object.remove().ok());
  Outcome<Done> again;
  object.removeAsync(again.callback());
  EXPECT_TRUE(again.get().ok());
  EXPECT_EQ(codeOf(object.read(0, 1)), kBadRange);
  EXPECT_EQ(codeOf(object.metadata()), kNoSuchObject);
  EXPECT_EQ(codeOf(object.thumbnail(160)), kNoSuchObject);
}

TEST_F(ObjectTest, RemovingAsynchronouslyRemovesAndForgets) {
  const Object object = onlyFile("x");
  Outcome<Done> removed;
  object.removeAsync(removed.callback());
  ASSERT_TRUE(removed.get().ok());
  EXPECT_FALSE(std::filesystem::exists(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG"));
  EXPECT_FALSE(device->object(object.info().handle));
}

TEST_F(ObjectTest, AFolderIsNotRemovedAndStaysInTheCatalogue) {
  onlyFile("x");
  const Object folder = named(catalogueOfCard(), "100ABCDE");
  EXPECT_EQ(codeOf(folder.remove()), kNotDeleted);
  Outcome<Done> later;
  folder.removeAsync(later.callback());
  EXPECT_EQ(codeOf(later.get()), kNotDeleted);
  EXPECT_TRUE(device->object(folder.info().handle));
  EXPECT_TRUE(std::filesystem::exists(service.card("CARD") + "/DCIM/100ABCDE/IMG_0001.JPG"));
}

TEST_F(ObjectTest, AnObjectKeepsItsSessionWhileTheBrowserIsThere) {
  const Object object = onlyFile("0123456789");
  device.reset();
  EXPECT_EQ(object.read(0, 10)->text(), "0123456789");
}

}  // namespace
}  // namespace orvid::test
