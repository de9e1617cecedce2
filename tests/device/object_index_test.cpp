// SPDX-License-Identifier: MIT
#include "device/object_index.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <filesystem>
#include <thread>

#include "content/recording_device.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class ObjectIndexTest : public testing::Test {
 protected:
  std::shared_ptr<BrivoFile> makeFile(const std::string& name) {
    test::writeFile(card / name, "x");
    return BrivoFile::initWithFSURL(card / name, std::string(std::filesystem::path(name).filename()), nullptr,
                                    *device);
  }
  std::shared_ptr<BrivoFolder> makeFolder(const std::string& name) {
    test::makeFolder(card / name);
    return BrivoFolder::initWithFSURL(card / name, name, nullptr, *device);
  }
  bool exists(const std::string& name) const { return std::filesystem::exists(card / name); }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  CatalogueCounters counters;
  ObjectIndex index{counters};
};

TEST_F(ObjectIndexTest, AnEmptyIndexAnswersNoneForEveryHandle) {
  for (const std::uint64_t handle : {std::uint64_t{0}, std::uint64_t{1}, std::uint64_t{0xFFFFFFFE}}) {
    EXPECT_EQ(index.cameraItemWithObjectID(handle), nullptr);
    EXPECT_EQ(index.cameraFileWithObjectID(handle), nullptr);
    EXPECT_EQ(index.cameraFolderWithObjectID(handle), nullptr);
  }
  EXPECT_THAT(index.copyIndexedFoldersAndFiles(), IsEmpty());
}

TEST_F(ObjectIndexTest, AFoldersHandleIsFoundAsAnItemButNotAsAFile) {
  const auto folder = makeFolder("100ABCDE");
  index.addCameraFolderToIndex(folder);
  EXPECT_EQ(index.cameraItemWithObjectID(folder->objHandle()), folder);
  EXPECT_EQ(index.cameraFolderWithObjectID(folder->objHandle()), folder);
  EXPECT_EQ(index.cameraFileWithObjectID(folder->objHandle()), nullptr);
}

TEST_F(ObjectIndexTest, AFolderAmongFilesAndAFileAmongFoldersChangeNothing) {
  index.addCameraFileToIndex(makeFolder("100ABCDE"));
  index.addCameraFolderToIndex(makeFile("IMG_0001.JPG"));
  EXPECT_THAT(index.copyIndexedFoldersAndFiles(), IsEmpty());
  EXPECT_EQ(counters.enumeratedItemCount(), 0u);
}

TEST_F(ObjectIndexTest, TheSameFileTwiceIsThereOnceButCountedTwice) {
  const auto file = makeFile("IMG_0001.JPG");
  index.addCameraFileToIndex(file);
  index.addCameraFileToIndex(file);
  EXPECT_THAT(index.copyIndexedFoldersAndFiles(), ElementsAre(file));
  EXPECT_EQ(counters.enumeratedItemCount(), 2u);
}

TEST_F(ObjectIndexTest, ACopyListsEveryFolderBeforeAnyFileInTheOrderOfHandles) {
  const auto file1 = makeFile("IMG_0001.JPG");
  const auto folder1 = makeFolder("100ABCDE");
  const auto file2 = makeFile("IMG_0002.JPG");
  const auto folder2 = makeFolder("101ABCDE");
  for (const auto& file : {file2, file1}) index.addCameraFileToIndex(file);
  for (const auto& folder : {folder2, folder1}) index.addCameraFolderToIndex(folder);
  EXPECT_THAT(index.copyIndexedFoldersAndFiles(), ElementsAre(folder1, folder2, file1, file2));
}

TEST_F(ObjectIndexTest, RemovingAnUnknownHandleCountsNothing) {
  index.addCameraFileToIndex(makeFile("IMG_0001.JPG"));
  index.removeCameraFileFromIndex(0xFFFFFFFF);
  EXPECT_EQ(counters.enumeratedItemCount(), 1u);
}

TEST_F(ObjectIndexTest, DeletingAFileRemovesItFromVolumeIndexAndCount) {
  const auto file = makeFile("IMG_0001.JPG");
  index.addCameraFileToIndex(file);
  EXPECT_TRUE(index.deleteFile(file));
  EXPECT_FALSE(exists("IMG_0001.JPG"));
  EXPECT_EQ(index.cameraItemWithObjectID(file->objHandle()), nullptr);
  EXPECT_EQ(counters.enumeratedItemCount(), 0u);
}

TEST_F(ObjectIndexTest, DeletingAFileThatIsGoneAlreadyRemovesItFromTheIndex) {
  const auto file = makeFile("IMG_0001.JPG");
  index.addCameraFileToIndex(file);
  test::writeFile(card / "IMG_0001/THM", "kept");
  std::filesystem::remove(card / "IMG_0001.JPG");
  EXPECT_TRUE(index.deleteFile(file));
  EXPECT_EQ(index.cameraItemWithObjectID(file->objHandle()), nullptr);
  EXPECT_TRUE(exists("IMG_0001/THM")) << "no sidecar goes when nothing was deleted";
}

TEST_F(ObjectIndexTest, DeletingALockedItemIsRefusedAndLeavesTheFile) {
  const auto file = makeFile("IMG_0001.JPG");
  index.addCameraFileToIndex(file);
  device->locked = true;
  EXPECT_FALSE(index.deleteFile(file));
  EXPECT_TRUE(exists("IMG_0001.JPG"));
  EXPECT_EQ(index.cameraFileWithObjectID(file->objHandle()), file);
}

TEST_F(ObjectIndexTest, TheSidecarIsAFileNamedThmInTheFolderOfTheBaseName) {
  const auto file = makeFile("100ABCDE/IMG_0001.JPG");
  test::writeFile(card / "100ABCDE/IMG_0001/THM", "goes");
  test::writeFile(card / "100ABCDE/IMG_0001.THM", "stays");
  EXPECT_TRUE(index.deleteFile(file));
  EXPECT_FALSE(exists("100ABCDE/IMG_0001/THM"));
  EXPECT_TRUE(exists("100ABCDE/IMG_0001.THM"));
}

TEST_F(ObjectIndexTest, AFolderIsNotDeleted) {
  const auto folder = makeFolder("100ABCDE");
  index.addCameraFolderToIndex(folder);
  EXPECT_FALSE(index.deleteFile(folder));
  EXPECT_TRUE(exists("100ABCDE"));
  EXPECT_EQ(index.cameraFolderWithObjectID(folder->objHandle()), folder);
}

TEST_F(ObjectIndexTest, NothingOutsideTheCardIsDeletedThroughALink) {
  const test::TemporaryFolder host;
  test::writeFile(host / "IMG_0001.JPG", "host");
  const auto file = makeFile("100ABCDE/IMG_0001.JPG");
  index.addCameraFileToIndex(file);
  std::filesystem::remove_all(card / "100ABCDE");
  std::filesystem::create_directory_symlink(host.path(), card / "100ABCDE");
  EXPECT_FALSE(index.deleteFile(file));
  EXPECT_EQ(test::readFile(host / "IMG_0001.JPG"), "host");
}

TEST_F(ObjectIndexTest, ItemsInFolderCountsTheEntriesOfSubFolders) {
  test::writeFile(card / "a/1", "");
  test::writeFile(card / "a/2", "");
  test::writeFile(card / "a/.hidden", "");
  test::writeFile(card / "b/3", "");
  test::writeFile(card / "file", "");
  const test::StandardErrorCapture log;
  EXPECT_EQ(ObjectIndex::itemsInFolder(card.path(), systemFiles()), 3u);
  EXPECT_THAT(log.text(), HasSubstr("content | [00003] - file://" + card.path()));
  EXPECT_EQ(ObjectIndex::itemsInFolder(card / "none", systemFiles()), 0u);
}

TEST_F(ObjectIndexTest, FilesAreEnteredAndFoundOnManyThreads) {
  test::writeFile(card / "IMG_0001.JPG", "x");
  const auto enter = [&] {
    for (int i = 0; i < 500; ++i) {
      const auto file = BrivoFile::initWithFSURL(card / "IMG_0001.JPG", "IMG_0001.JPG", nullptr, *device);
      index.addCameraFileToIndex(file);
      EXPECT_EQ(index.cameraItemWithObjectID(file->objHandle()), file);
    }
  };
  std::thread first(enter);
  std::thread second(enter);
  first.join();
  second.join();
  EXPECT_EQ(counters.enumeratedItemCount(), 1000u);
  const auto items = index.copyIndexedFoldersAndFiles();
  EXPECT_TRUE(std::ranges::is_sorted(items, {}, &BrivoItem::objHandle));
}

}  // namespace
}  // namespace brivo
