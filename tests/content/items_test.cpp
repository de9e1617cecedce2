// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <thread>

#include "content/fs_camera_item.h"
#include "content/recording_device.h"
#include "protocol/result_codes.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

/// A file system whose answers are made up, for what a test machine's file system would not say.
class MadeUpFileSystem : public FileSystem {
 public:
  Result<ResourceValues> resourceValues(const std::string&) override { return values; }
  Result<std::vector<std::string>> names(const std::string&) override { return std::vector<std::string>(); }
  Result<std::vector<DirectoryEntry>> entries(const std::string&) override {
    return std::vector<DirectoryEntry>();
  }
  Result<UniqueFd> open(const std::string& path) override { return SystemError{"open " + path}; }
  std::int64_t read(int, std::span<std::byte>, std::uint64_t) override { return -1; }
  std::optional<SystemError> remove(const std::string&) override { return std::nullopt; }

  ResourceValues values;
};

class ItemTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> makeFile(const std::string& name, const BrivoItem* parent = nullptr) {
    return BrivoFile::initWithFSURL(card / name, name, parent, *device);
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
};

TEST_F(ItemTest, TheFirstItemHasHandle1AndTheNext2AcrossDevices) {
  test::writeFile(card / "IMG_0001.JPG", "");
  const auto other = std::make_shared<RecordingDevice>();
  EXPECT_EQ(makeFile("IMG_0001.JPG")->objHandle(), 1u);
  EXPECT_EQ(BrivoFolder::initWithFSURL(card.path(), "CARD", nullptr, *other)->objHandle(), 2u);
  EXPECT_EQ(makeFile("IMG_0001.JPG")->objHandle(), 3u);
}

TEST_F(ItemTest, AFileWhoseValuesCannotBeReadYieldsNoItemAndLeavesTheCounter) {
  test::writeFile(card / "IMG_0001.JPG", "");
  const std::uint32_t before = makeFile("IMG_0001.JPG")->objHandle();
  EXPECT_EQ(makeFile("IMG_0002.JPG"), nullptr);
  EXPECT_EQ(makeFile("IMG_0001.JPG")->objHandle(), before + 1);
}

TEST_F(ItemTest, AReadOnlyFileIsProtectedAndLockedAndSoIsAWritableOneOnALockedDevice) {
  MadeUpFileSystem files;
  device->fileSystem = &files;
  const auto readOnly = makeFile("IMG_0001.JPG");
  EXPECT_TRUE(readOnly->protectionStatus());
  EXPECT_EQ(readOnly->info().protectionStatus(), 1);
  EXPECT_TRUE(readOnly->locked());
  files.values.writable = true;
  const auto writable = makeFile("IMG_0002.JPG");
  EXPECT_FALSE(writable->protectionStatus());
  EXPECT_FALSE(writable->locked());
  device->locked = true;
  EXPECT_TRUE(writable->locked());
  EXPECT_FALSE(writable->protectionStatus());
}

TEST_F(ItemTest, AFileFromBefore1970HasACaptureDateOf0) {
  MadeUpFileSystem files;
  files.values.created = {-1, 0};
  files.values.modified = {-100, 999'999'999};
  device->fileSystem = &files;
  EXPECT_EQ(makeFile("IMG_0001.JPG")->captureDate(), 0u);
  EXPECT_EQ(makeFile("IMG_0001.JPG")->modificationDate(), 0u);
}

TEST_F(ItemTest, DatesAreCutToWholeSeconds) {
  MadeUpFileSystem files;
  files.values.created = {1'700'000'000, 999'999'999};
  files.values.modified = {1'700'000'001, 1};
  files.values.size = std::uint64_t{5} << 32;
  device->fileSystem = &files;
  const auto item = makeFile("IMG_0001.JPG");
  EXPECT_EQ(item->captureDate(), 1'700'000'000u);
  EXPECT_EQ(item->modificationDate(), 1'700'000'001u);
  EXPECT_EQ(item->size(), std::uint64_t{5} << 32);
  EXPECT_EQ(item->fileSize(), item->objectCompressedSize());
}

TEST_F(ItemTest, TheNameIsTheArgumentAndTheParentTheParentsHandle) {
  test::writeFile(card / "file", "abc");
  const auto parent = BrivoFolder::initWithFSURL(card.path(), "CARD", nullptr, *device);
  const auto item = BrivoFile::initWithFSURL(card / "file", "IMG_0001.JPG", parent.get(), *device);
  EXPECT_EQ(item->name(), "IMG_0001.JPG");
  EXPECT_EQ(item->path(), card / "file");
  EXPECT_EQ(item->parentObject(), parent->objHandle());
  EXPECT_EQ(makeFile("file")->parentObject(), 0u);
  EXPECT_EQ(item->size(), 3u);
}

TEST_F(ItemTest, AFolderHasAssociationType1AndWithoutAParentTheTopLevelOne) {
  const auto top = BrivoFolder::initWithFSURL(card.path(), "DCIM", nullptr, *device);
  const auto sub = BrivoFolder::initWithFSURL(card.path(), "100ABCDE", top.get(), *device);
  EXPECT_EQ(top->info().associationType(), 1);
  EXPECT_EQ(top->parentObject(), kTopLevelParent);
  EXPECT_EQ(sub->parentObject(), top->objHandle());
  EXPECT_EQ(top->type(), 0u);
}

TEST_F(ItemTest, HandlesOrderItemsAscending) {
  const auto first = BrivoFolder::initWithFSURL(card.path(), "a", nullptr, *device);
  const auto second = BrivoFolder::initWithFSURL(card.path(), "b", nullptr, *device);
  EXPECT_EQ(first->compareObjectHandle(*second), -1);
  EXPECT_EQ(second->compareObjectHandle(*first), 1);
  EXPECT_EQ(first->compareObjectHandle(*first), 0);
  EXPECT_EQ(second->unsignedIntegerValue(), second->objHandle());
}

TEST_F(ItemTest, HandlesAreUniqueWhenManyThreadsMakeItems) {
  std::vector<std::vector<std::uint32_t>> handles(4);
  std::vector<std::thread> threads;
  for (auto& own : handles) {
    threads.emplace_back([&] {
      for (int i = 0; i < 200; ++i) {
        own.push_back(BrivoFolder::initWithFSURL(card.path(), "x", nullptr, *device)->objHandle());
      }
    });
  }
  for (auto& thread : threads) thread.join();
  std::vector<std::uint32_t> all;
  for (const auto& own : handles) all.insert(all.end(), own.begin(), own.end());
  std::ranges::sort(all);
  EXPECT_EQ(std::ranges::adjacent_find(all), all.end());
}

TEST_F(ItemTest, AnItemWithoutMetadataAnswersOnceWithNothing) {
  const auto folder = BrivoFolder::initWithFSURL(card.path(), "a", nullptr, *device);
  int answers = 0;
  const auto expectNothing = [&](const Dictionary& result) {
    ++answers;
    EXPECT_TRUE(result.empty());
  };
  folder->metadataWithOptions({}, expectNothing);
  folder->thumbnailDataWithOptions({}, expectNothing);
  EXPECT_EQ(answers, 2);
}

TEST_F(ItemTest, TheBaseNameIsTheLastComponentWithoutItsExtension) {
  EXPECT_EQ(baseName("/V/DCIM/100ABCDE/IMG_0001.JPG"), "IMG_0001");
  EXPECT_EQ(baseName("IMG_0001"), "IMG_0001");
  EXPECT_EQ(baseName("a.b.c"), "a.b");
}

TEST_F(ItemTest, AFileForReadingOnlyHasASizeAndNoHandle) {
  test::writeFile(card / "dir/IMG_0001.THM", "12345");
  // The parent's path must end with a separator, because none is put in.
  const auto parent = BrivoFolder::initWithFSURL(card / "dir/", "dir", nullptr, *device);
  const auto file = BrivoFile::initForReadingOnlyWithName("IMG_0001.THM", *parent, *device);
  ASSERT_TRUE(file);
  EXPECT_EQ(file->size(), 5u);
  EXPECT_EQ(file->name(), "IMG_0001.THM");
  EXPECT_EQ(file->parentObject(), parent->objHandle());
  EXPECT_EQ(file->objHandle(), 0u);
  EXPECT_EQ(BrivoFile::initForReadingOnlyWithName("IMG_0002.THM", *parent, *device), nullptr);
}

TEST(FSCameraItemTest, CopiesAnEntryOfADirectoryWalk) {
  const auto item = MSFSCameraItem::initWithFSStructure({"IMG_0001.JPG", 7, 1234, 2, {10, 11}, {20, 21}});
  EXPECT_EQ(item.name(), "IMG_0001.JPG");
  EXPECT_EQ(item.ino(), 7u);
  EXPECT_EQ(item.size(), 1234);
  EXPECT_EQ(item.flags(), 2u);
  EXPECT_TRUE(item.locked());
  EXPECT_EQ(item.creationTimeSpec(), (FileTime{10, 11}));
  EXPECT_EQ(item.modificationTimeSpec(), (FileTime{20, 21}));
  EXPECT_EQ(item.creationTime(), 10);
  EXPECT_EQ(item.modificationTime(), 20);
  EXPECT_FALSE(MSFSCameraItem::initWithFSStructure({"x", 1, 1, 1, {}, {}}).locked());
}

TEST(FSCameraItemTest, OfAUrlBothTimesAreTheModificationTimeInWholeSeconds) {
  const test::TemporaryFolder card;
  test::writeFile(card / "f", "abc");
  const timespec times[2] = {{1'600'000'000, 5}, {1'500'000'000, 7}};
  ASSERT_EQ(::utimensat(AT_FDCWD, (card / "f").c_str(), times, 0), 0);
  const auto item = MSFSCameraItem::initWithFSURL(card / "f", systemFiles());
  ASSERT_TRUE(item);
  EXPECT_EQ(item->creationTimeSpec(), (FileTime{1'500'000'000, 0}));
  EXPECT_EQ(item->modificationTimeSpec(), (FileTime{1'500'000'000, 0}));
  EXPECT_EQ(item->size(), 3);
  EXPECT_EQ(item->ino(), 0u);
  EXPECT_FALSE(item->locked());
  EXPECT_FALSE(MSFSCameraItem::initWithFSURL(card / "none", systemFiles()));
}

TEST_F(ItemTest, AFileInAFolderKnowsItsWholePathWhateverItIsCalled) {
  test::writeFile(card / "IMG_0001.JPG", "");
  const auto folder = BrivoFolder::initWithFSURL(card.path(), "CARD", nullptr, *device);
  EXPECT_EQ(folder->path(), card.path());
  EXPECT_EQ(makeFile("IMG_0001.JPG", folder.get())->path(), card / "IMG_0001.JPG");
  const auto renamed = BrivoFile::initWithFSURL(card / "IMG_0001.JPG", "OTHER.JPG", folder.get(), *device);
  EXPECT_EQ(renamed->path(), card / "IMG_0001.JPG") << "not below its name";
  EXPECT_EQ(renamed->name(), "OTHER.JPG");
}

}  // namespace
}  // namespace brivo
