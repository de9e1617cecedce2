// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_catalogue.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "support/environment.h"
#include "support/temporary_folder.h"

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
  const std::string file = folder / "system/applications/a.desktop";
  const auto longAgo = std::filesystem::file_time_type::clock::now() - std::chrono::hours(1);
  install("system", "a.desktop", first);
  std::filesystem::last_write_time(file, longAgo);
  std::filesystem::last_write_time(folder / "system/applications", longAgo);
  EXPECT_EQ(identifierOf(first), "a");
  install("system", "a.desktop", second);
  EXPECT_EQ(identifierOf(first), std::nullopt);
  EXPECT_EQ(identifierOf(second), "a");
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
