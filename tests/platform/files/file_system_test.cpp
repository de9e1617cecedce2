// SPDX-License-Identifier: MIT
#include "platform/files/file_system.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "support/raw_dbus.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using test::writeFile;
using testing::ElementsAre;
using testing::UnorderedElementsAre;

class FileSystemTest : public testing::Test {
 protected:
  std::vector<std::string> sortedNames(const std::string& path) {
    auto names = std::move(files.names(path)).value();
    std::ranges::sort(names);
    return names;
  }

  test::TemporaryFolder card;
  FileSystem& files = systemFiles();
};

TEST_F(FileSystemTest, TellsSizeKindAndTimes) {
  writeFile(card / "a.jpg", std::string(1234, 'x'));
  const timespec times[2] = {{1'600'000'000, 5}, {1'500'000'000, 7}};
  ASSERT_EQ(::utimensat(AT_FDCWD, (card / "a.jpg").c_str(), times, 0), 0);
  const auto values = files.resourceValues(card / "a.jpg");
  ASSERT_TRUE(values.ok()) << values.error().text();
  EXPECT_EQ(values->size, 1234u);
  EXPECT_FALSE(values->directory);
  EXPECT_TRUE(values->writable);
  EXPECT_EQ(values->modified, (FileTime{1'500'000'000, 7}));
  EXPECT_GT(values->created.seconds, 0);
  EXPECT_TRUE(files.resourceValues(card.path())->directory);
}

TEST_F(FileSystemTest, AMissingFileIsAnErrorThatNamesIt) {
  const auto values = files.resourceValues(card / "none");
  ASSERT_FALSE(values.ok());
  EXPECT_EQ(values.error().code, ENOENT);
  EXPECT_THAT(values.error().text(), testing::HasSubstr(card / "none"));
}

TEST_F(FileSystemTest, OnlyRegularFilesAndDirectoriesHaveResourceValues) {
  writeFile(card / "file", "x");
  ASSERT_EQ(::symlink("file", (card / "link").c_str()), 0);
  ASSERT_EQ(::mkfifo((card / "fifo").c_str(), 0600), 0);
  EXPECT_FALSE(files.resourceValues(card / "link").ok());
  EXPECT_FALSE(files.resourceValues(card / "fifo").ok());
  EXPECT_FALSE(files.resourceValues("/dev/zero").ok());
  for (const DirectoryEntry& entry : *files.entries(card.path())) {
    EXPECT_EQ(entry.hasValues, entry.name == "file") << entry.name;
  }
}

TEST_F(FileSystemTest, ASymbolicLinkAtAnyLevelIsRefused) {
  writeFile(card / "real/secret", "host");
  ASSERT_EQ(::symlink("real", (card / "DCIM").c_str()), 0);
  ASSERT_EQ(::symlink((card / "real/secret").c_str(), (card / "IMG_0001.JPG").c_str()), 0);
  EXPECT_EQ(files.open(card / "IMG_0001.JPG").error().code, ELOOP);
  EXPECT_EQ(files.open(card / "DCIM/secret").error().code, ELOOP);
  EXPECT_EQ(files.resourceValues(card / "DCIM/secret").error().code, ELOOP);
  EXPECT_EQ(files.names(card / "DCIM").error().code, ELOOP);
  EXPECT_TRUE(files.remove(card / "DCIM/secret").has_value());
  EXPECT_EQ(test::readFile(card / "real/secret"), "host");
}

TEST_F(FileSystemTest, RemovingALinkRemovesTheLink) {
  writeFile(card / "real", "host");
  ASSERT_EQ(::symlink("real", (card / "link").c_str()), 0);
  EXPECT_FALSE(files.remove(card / "link").has_value());
  EXPECT_EQ(test::readFile(card / "real"), "host");
}

TEST_F(FileSystemTest, AFifoNamedLikeAPictureDoesNotBlock) {
  ASSERT_EQ(::mkfifo((card / "IMG_0001.JPG").c_str(), 0600), 0);
  EXPECT_EQ(files.open(card / "IMG_0001.JPG").error().code, EINVAL);
}

TEST_F(FileSystemTest, ADeviceIsNotOpened) {
  if (::mknod((card / "IMG_0001.JPG").c_str(), S_IFCHR | 0600, makedev(1, 3)) != 0) {
    GTEST_SKIP() << "making device nodes needs root";
  }
  const auto fd = files.open(card / "IMG_0001.JPG");
  EXPECT_FALSE(fd.ok());
}

TEST_F(FileSystemTest, HiddenEntriesAreSkipped) {
  writeFile(card / ".hidden", "");
  writeFile(card / "._IMG_0001.JPG", "");
  writeFile(card / "seen", "");
  EXPECT_THAT(sortedNames(card.path()), ElementsAre("seen"));
  EXPECT_EQ(files.entries(card.path())->size(), 1u);
}

TEST_F(FileSystemTest, NamesAreBytes) {
  const std::vector<std::string> odd = {"new\nline", std::string(255, 'x'), "\xFF\xFE", "\xC3\xA4"};
  for (const std::string& name : odd) writeFile(card / name, name);
  EXPECT_THAT(sortedNames(card.path()), UnorderedElementsAre(odd[0], odd[1], odd[2], odd[3]));
  for (const std::string& name : odd) {
    const auto fd = files.open(card / name);
    ASSERT_TRUE(fd.ok()) << fd.error().text();
    std::vector<std::byte> bytes(300);
    EXPECT_EQ(files.read(fd->get(), bytes, 0), static_cast<std::int64_t>(name.size()));
  }
}

TEST_F(FileSystemTest, ReadsAreExactAndShortOnlyAtTheEnd) {
  writeFile(card / "f", "0123456789");
  const auto fd = files.open(card / "f");
  ASSERT_TRUE(fd.ok());
  std::vector<std::byte> bytes(4);
  EXPECT_EQ(files.read(fd->get(), bytes, 3), 4);
  EXPECT_EQ(bytes[0], std::byte{'3'});
  EXPECT_EQ(files.read(fd->get(), bytes, 8), 2);
  EXPECT_EQ(files.read(fd->get(), bytes, 10), 0);
  EXPECT_EQ(files.read(-1, bytes, 0), -1);
}

TEST_F(FileSystemTest, ADirectoryIsNeitherOpenedNorRemovedAsAFile) {
  test::makeFolder(card / "d");
  EXPECT_FALSE(files.open(card / "d").ok());
  EXPECT_TRUE(files.remove(card / "d").has_value());
  EXPECT_EQ(files.remove(card / "none")->code, ENOENT);
}

TEST_F(FileSystemTest, AFileIsNoDirectory) {
  writeFile(card / "DCIM", "");
  EXPECT_EQ(files.names(card / "DCIM").error().code, ENOTDIR);
}

TEST_F(FileSystemTest, ListingLeavesNoDescriptorOpen) {
  for (int i = 0; i < 100; ++i) writeFile(card / ("f" + std::to_string(i)), "");
  const std::size_t before = test::openDescriptorCount();
  (void)files.entries(card.path());
  (void)files.names(card.path());
  (void)files.resourceValues(card / "f1");
  EXPECT_EQ(test::openDescriptorCount(), before);
}

TEST_F(FileSystemTest, AHundredThousandEntriesAreListed) {
  std::filesystem::create_directory(card / "many");
  const UniqueFd folder(::open((card / "many").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  for (int i = 0; i < 100'000; ++i) {
    const std::string name = "F" + std::to_string(i);
    UniqueFd(::openat(folder.get(), name.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
  }
  EXPECT_EQ(files.names(card / "many")->size(), 100'000u);
  const auto entries = files.entries(card / "many");
  EXPECT_EQ(entries->size(), 100'000u);
  EXPECT_TRUE(std::ranges::all_of(*entries, &DirectoryEntry::hasValues));
}

TEST_F(FileSystemTest, OnAReadOnlyMountNothingIsWritable) {
  writeFile(card / "inner/f", "x");
  const std::string point = card / "inner";
  if (::mount(point.c_str(), point.c_str(), nullptr, MS_BIND, nullptr) != 0) {
    GTEST_SKIP() << "mounting needs root";
  }
  EXPECT_TRUE(files.resourceValues(point + "/f")->writable);
  EXPECT_EQ(::mount(nullptr, point.c_str(), nullptr, MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr), 0);
  EXPECT_FALSE(files.resourceValues(point + "/f")->writable);
  EXPECT_FALSE(files.entries(point)->front().values.writable);
  EXPECT_EQ(::umount(point.c_str()), 0);
}

}  // namespace
}  // namespace brivo
