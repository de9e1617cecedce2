// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_catalogue.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <chrono>
#include <filesystem>

#include "support/descriptor_limit.h"
#include "support/environment.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

class DesktopCatalogueTest : public testing::Test {
 protected:
  void install(const std::string& dataDir, const std::string& file, const std::string& program) {
    test::writeFile(folder / (dataDir + "/applications/" + file),
                    "[Desktop Entry]\nType=Application\nExec=" + program + "\n");
  }
  std::string makeProgram(const std::string& name) {
    const std::string path = folder / ("bin/" + name);
    test::writeFile(path, "#!/bin/sh\n");
    ::chmod(path.c_str(), 0755);
    return path;
  }
  std::optional<std::string> identifierOf(const std::string& program) {
    struct stat status {};
    EXPECT_EQ(::stat(program.c_str(), &status), 0);
    return catalogue.identifierOfProgram(status.st_dev, status.st_ino);
  }
  /// Waits until what was installed so far is too old to be read again for that alone.
  void waitUntilOld() {
    test::writeFile(folder / "last", "");
    const auto time = std::filesystem::last_write_time(folder / "last") + std::chrono::milliseconds(2100);
    ASSERT_TRUE(test::waitUntil([&] { return std::filesystem::file_time_type::clock::now() > time; }));
  }
  /// From here on what was installed is read again only when it changes.
  void settle() {
    waitUntilOld();
    EXPECT_FALSE(catalogue.isInstalled("anything"));
  }

  test::TemporaryFolder folder;
  DesktopCatalogue catalogue{folder / "user", {folder / "local", folder / "system"}, "org.orvid."};
};

TEST_F(DesktopCatalogueTest, AProgramIsKnownByItsFileAndNotByItsName) {
  const std::string program = makeProgram("photos");
  std::filesystem::create_symlink(program, folder / "bin/link");
  install("system", "org.example.Photos.desktop", folder / "bin/link");
  EXPECT_EQ(identifierOf(program), "org.example.Photos");
  EXPECT_EQ(identifierOf(makeProgram("other")), std::nullopt);
}

TEST_F(DesktopCatalogueTest, ABareNameIsLookedUpInThePath) {
  const std::string program = makeProgram("photos");
  const test::ScopedVariable path("PATH", folder / "bin");
  install("system", "org.example.Photos.desktop", "photos");
  EXPECT_EQ(identifierOf(program), "org.example.Photos");
}

TEST_F(DesktopCatalogueTest, ASubFolderIsPartOfTheId) {
  const std::string program = makeProgram("photos");
  install("system", "vendor/photos.desktop", program);
  EXPECT_EQ(identifierOf(program), "vendor-photos");
}

TEST_F(DesktopCatalogueTest, AVendorIdCountsFromTheSystemsFoldersOnly) {
  const std::string program = makeProgram("photos");
  install("user", "org.orvid.Photos.desktop", program);
  EXPECT_EQ(identifierOf(program), std::nullopt);
  EXPECT_FALSE(catalogue.isInstalled("org.orvid.Photos"));
  install("system", "org.orvid.Photos.desktop", program);
  EXPECT_EQ(identifierOf(program), "org.orvid.Photos");
}

TEST_F(DesktopCatalogueTest, TheUsersFolderComesFirst) {
  const std::string program = makeProgram("photos");
  install("system", "b.desktop", program);
  install("local", "c.desktop", program);
  install("user", "z.desktop", program);
  EXPECT_EQ(identifierOf(program), "z");
}

TEST_F(DesktopCatalogueTest, ChangesAreSeen) {
  const std::string program = makeProgram("photos");
  EXPECT_EQ(identifierOf(program), std::nullopt);
  install("system", "a.desktop", program);
  EXPECT_EQ(identifierOf(program), "a");
  EXPECT_TRUE(catalogue.isInstalled("a"));
  std::filesystem::remove(folder / "system/applications/a.desktop");
  EXPECT_FALSE(catalogue.isInstalled("a"));
}

TEST_F(DesktopCatalogueTest, AFileThatIsWrittenAnewInItsPlaceIsReadAgain) {
  const std::string first = makeProgram("first");
  const std::string second = makeProgram("second");
  install("system", "a.desktop", first);
  settle();
  EXPECT_EQ(identifierOf(first), "a");
  install("system", "a.desktop", second);
  EXPECT_EQ(identifierOf(first), std::nullopt);
  EXPECT_EQ(identifierOf(second), "a");
}

TEST_F(DesktopCatalogueTest, AFileThatIsChangedWithoutItsTimeIsReadAgain) {
  const std::string program = makeProgram("photos");
  const std::string file = folder / "system/applications/a.desktop";
  install("system", "a.desktop", folder / "bin/none");
  const auto time = std::filesystem::last_write_time(file);
  settle();
  install("system", "a.desktop", program);
  std::filesystem::last_write_time(file, time);
  EXPECT_EQ(identifierOf(program), "a");
}

TEST_F(DesktopCatalogueTest, AProgramThatComesIntoThePathLaterIsFound) {
  const test::ScopedVariable path("PATH", (folder / "early") + ":" + (folder / "bin"));
  install("system", "a.desktop", "photos");
  settle();
  const std::string program = makeProgram("photos");
  EXPECT_EQ(identifierOf(program), "a");
  std::filesystem::create_directory(folder / "early");
  std::filesystem::copy_file(program, folder / "early/photos");
  EXPECT_EQ(identifierOf(folder / "early/photos"), "a");
  EXPECT_EQ(identifierOf(program), std::nullopt) << "it is no longer what the name means";
}

TEST_F(DesktopCatalogueTest, WithoutDescriptorsTheFoldersAreAsTheyWere) {
  const std::string program = makeProgram("photos");
  install("user", "a.desktop", program);
  install("system", "vendor/b.desktop", folder / "bin/other");
  ASSERT_TRUE(catalogue.isInstalled("a"));
  for (const rlim_t spare : {0, 1, 2}) {
    const test::DescriptorLimit limit(spare);
    EXPECT_TRUE(catalogue.isInstalled("a")) << spare;
    EXPECT_TRUE(catalogue.isInstalled("vendor-b")) << spare;
    EXPECT_EQ(identifierOf(program), "a") << spare;
  }
}

TEST_F(DesktopCatalogueTest, WhatWasNeverListedMayBeInstalled) {
  install("system", "a.desktop", makeProgram("photos"));
  {
    const test::DescriptorLimit limit(0);
    EXPECT_TRUE(catalogue.isInstalled("a"));
  }
  EXPECT_TRUE(catalogue.isInstalled("a"));
  EXPECT_FALSE(catalogue.isInstalled("b"));
}

TEST_F(DesktopCatalogueTest, AReadingThatFailedIsMadeUpForThoughNothingChanges) {
  const std::string program = makeProgram("photos");
  install("system", "a.desktop", program);
  waitUntilOld();
  {
    const test::DescriptorLimit limit(0);
    catalogue.isInstalled("a");
  }
  EXPECT_EQ(identifierOf(program), "a");
}

/// A regular file that cannot be read by anybody: what follows is an I/O error.
constexpr const char* kUnreadable = "/proc/self/mem";

TEST_F(DesktopCatalogueTest, AFileThatCannotBeReadIsAsItWasAndTheOthersAreRead) {
  const std::string program = makeProgram("photos");
  const std::string other = makeProgram("other");
  install("system", "a.desktop", program);
  ASSERT_EQ(identifierOf(program), "a");
  std::filesystem::remove(folder / "system/applications/a.desktop");
  std::filesystem::create_symlink(kUnreadable, folder / "system/applications/a.desktop");
  install("system", "b.desktop", other);
  EXPECT_EQ(identifierOf(program), "a");
  EXPECT_TRUE(catalogue.isInstalled("a"));
  EXPECT_EQ(identifierOf(other), "b");
  std::filesystem::remove(folder / "system/applications/a.desktop");
  EXPECT_EQ(identifierOf(program), std::nullopt);
  EXPECT_FALSE(catalogue.isInstalled("a"));
}

TEST_F(DesktopCatalogueTest, AFileThatWasNeverReadIsThatOfAnApplication) {
  test::makeFolder(folder / "system/applications");
  std::filesystem::create_symlink(kUnreadable, folder / "system/applications/a.desktop");
  EXPECT_TRUE(catalogue.isInstalled("a"));
  EXPECT_FALSE(catalogue.isInstalled("b"));
}

TEST_F(DesktopCatalogueTest, WhatIsNoReadableFileIsPassedOver) {
  const std::string program = makeProgram("photos");
  const std::string applications = folder / "user/applications";
  test::makeFolder(applications + "/folder.desktop");
  ASSERT_EQ(::mkfifo((applications + "/fifo.desktop").c_str(), 0600), 0);
  std::filesystem::create_symlink("/dev/zero", applications + "/device.desktop");
  std::filesystem::create_symlink("nothing", applications + "/dangling.desktop");
  test::writeFile(applications + "/huge.desktop",
                  "[Desktop Entry]\nType=Application\nExec=" + program + "\n");
  std::filesystem::resize_file(applications + "/huge.desktop", std::uintmax_t{1} << 40);
  install("user", "photos.desktop", program);
  EXPECT_EQ(identifierOf(program), "photos");
  for (const char* none : {"folder", "fifo", "device", "dangling", "huge"})
    EXPECT_FALSE(catalogue.isInstalled(none)) << none;
}

TEST_F(DesktopCatalogueTest, AnAbsolutePathIsInstalledWhenItIsAnExecutableFile) {
  EXPECT_TRUE(catalogue.isInstalled(makeProgram("photos")));
  test::writeFile(folder / "data", "");
  EXPECT_FALSE(catalogue.isInstalled(folder / "data"));
  EXPECT_FALSE(catalogue.isInstalled(folder.path()));
  EXPECT_FALSE(catalogue.isInstalled(folder / "none"));
}

TEST_F(DesktopCatalogueTest, OddIdentifiersAreNotInstalled) {
  for (const char* odd : {"", "a/b", "../a", "org.example.Unknown", "'; DROP TABLE orvid_apps; --"}) {
    EXPECT_FALSE(catalogue.isInstalled(odd)) << odd;
  }
}

TEST_F(DesktopCatalogueTest, LinksThatGoInCirclesEnd) {
  test::makeFolder(folder / "system/applications");
  std::filesystem::create_directory_symlink(folder / "system/applications",
                                            folder / "system/applications/again");
  EXPECT_FALSE(catalogue.isInstalled("x"));
}

}  // namespace
}  // namespace brivo
