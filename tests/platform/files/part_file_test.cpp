// SPDX-License-Identifier: MIT
#include "platform/files/part_file.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>

#include "platform/base/data.h"
#include "support/mounts.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

std::span<const std::byte> bytesOf(std::string_view text) { return std::as_bytes(std::span(text)); }

class PartFileTest : public testing::Test {
 protected:
  std::unique_ptr<PartFile> open() {
    auto opened = PartFile::open(part);
    EXPECT_TRUE(opened.ok());
    return opened.ok() ? *std::move(opened) : nullptr;
  }
  test::TemporaryFolder folder;
  const std::string part = folder / ".part";
  const std::string target = folder / "IMG_0001.JPG";
};

TEST_F(PartFileTest, WhatIsPublishedHasItsNameAndNoOther) {
  const auto file = open();
  EXPECT_FALSE(file->append(bytesOf("01234")));
  EXPECT_FALSE(file->append(bytesOf("56789")));
  EXPECT_EQ(file->size(), 10u);
  EXPECT_FALSE(file->synchronize());
  EXPECT_FALSE(std::filesystem::exists(target));
  EXPECT_FALSE(file->publish(target));
  EXPECT_EQ(test::readFile(target), "0123456789");
  EXPECT_FALSE(std::filesystem::exists(part));
}

TEST_F(PartFileTest, WhatWasNotPublishedIsGoneOnWith) {
  EXPECT_FALSE(open()->append(bytesOf("01234")));
  const auto file = open();
  EXPECT_EQ(file->size(), 5u);
  EXPECT_FALSE(file->append(bytesOf("56789")));
  EXPECT_FALSE(file->publish(target));
  EXPECT_EQ(test::readFile(target), "0123456789");
}

TEST_F(PartFileTest, ItCanBeShortenedAndReadAndDiscarded) {
  const auto file = open();
  EXPECT_FALSE(file->append(bytesOf("0123456789")));
  EXPECT_FALSE(file->truncate(4));
  EXPECT_FALSE(file->append(bytesOf("xy")));
  std::vector<std::byte> bytes(10);
  const auto count = file->read(bytes, 1);
  ASSERT_TRUE(count.ok());
  EXPECT_EQ(Data::copyOf(std::span(bytes).first(*count)).text(), "123xy");
  file->discard();
  EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
}

TEST_F(PartFileTest, OneAtATimeHasIt) {
  const auto file = open();
  const auto second = PartFile::open(part);
  ASSERT_FALSE(second.ok());
  EXPECT_EQ(second.error().code, EWOULDBLOCK);
}

TEST_F(PartFileTest, ALinkIsNotFollowed) {
  test::writeFile(folder / "elsewhere", "precious");
  std::filesystem::create_symlink(folder / "elsewhere", part);
  EXPECT_FALSE(PartFile::open(part).ok());
}

TEST_F(PartFileTest, PublishingReplacesAndPublishingAsNewDoesNot) {
  test::writeFile(target, "old");
  auto file = open();
  EXPECT_FALSE(file->append(bytesOf("new")));
  const auto refused = file->publishAsNew(target);
  ASSERT_TRUE(refused);
  EXPECT_EQ(refused->code, EEXIST);
  EXPECT_EQ(test::readFile(target), "old");
  EXPECT_FALSE(file->publishAsNew(folder / "IMG_0001-1.JPG"));
  file = open();
  EXPECT_FALSE(file->append(bytesOf("newer")));
  EXPECT_FALSE(file->publish(target));
  EXPECT_EQ(test::readFile(target), "newer");
}

TEST_F(PartFileTest, TimesAreKept) {
  const auto file = open();
  EXPECT_FALSE(file->setTimes({1'000'000'000, 500}));
  EXPECT_FALSE(file->publish(target));
  struct stat status {};
  ASSERT_EQ(::stat(target.c_str(), &status), 0);
  EXPECT_EQ(status.st_mtim.tv_sec, 1'000'000'000);
}

TEST_F(PartFileTest, RoomIsTakenWithoutChangingTheSize) {
  const auto file = open();
  EXPECT_FALSE(file->reserve(1'000'000));
  EXPECT_EQ(file->size(), 0u);
  EXPECT_EQ(std::filesystem::file_size(part), 0u);
}

TEST_F(PartFileTest, AFullDiskIsSaidBeforeAndWhileWriting) {
  if (!test::enterMountNamespace()) GTEST_SKIP() << "needs root";
  const test::LoopMount disk(folder / "disk", 4);
  auto opened = PartFile::open(disk.point() + "/.part");
  ASSERT_TRUE(opened.ok());
  const auto tooMuch = (*opened)->reserve(100'000'000);
  ASSERT_TRUE(tooMuch);
  EXPECT_EQ(tooMuch->code, ENOSPC);
  const std::string megabyte(1'000'000, 'x');
  std::optional<SystemError> error;
  for (int i = 0; i < 10 && !error; ++i) error = (*opened)->append(bytesOf(megabyte));
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, ENOSPC);
}

TEST_F(PartFileTest, AFolderThatIsNotThereIsAnError) {
  const auto opened = PartFile::open(folder / "none/.part");
  ASSERT_FALSE(opened.ok());
  EXPECT_EQ(opened.error().code, ENOENT);
}

}  // namespace
}  // namespace brivo
