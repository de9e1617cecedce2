// SPDX-License-Identifier: MIT
#include "platform/preferences/preferences_store.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "support/temporary_folder.h"

namespace brivo {
namespace {

TEST(PreferencesStoreTest, WhatIsWrittenIsRead) {
  const test::TemporaryFolder folder;
  const PreferencesStore store(folder / "config");
  ASSERT_FALSE(store.write("org.example", {{"level", 3}}));
  EXPECT_EQ(store.read("org.example").signedInteger("level"), 3);
  struct stat status {};
  ASSERT_EQ(::stat((folder / "config").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
}

TEST(PreferencesStoreTest, MissingAndCorruptFilesReadAsEmpty) {
  const test::TemporaryFolder folder;
  const PreferencesStore store(folder.path());
  EXPECT_TRUE(store.read("org.example").empty());
  test::writeFile(folder / "org.example.plist", "\x00\xFFgarbage");
  EXPECT_TRUE(store.read("org.example").empty());
  test::writeFile(folder / "org.example.plist", std::string((1 << 20) + 1, ' '));
  EXPECT_TRUE(store.read("org.example").empty());
}

TEST(PreferencesStoreTest, AFailedWriteSaysWhatAndLeavesNoTemporaryFile) {
  const test::TemporaryFolder folder;
  const PreferencesStore nowhere(folder / "a/b");
  const auto error = nowhere.write("org.example", {});
  ASSERT_TRUE(error);
  EXPECT_NE(error->text().find(folder / "a/b/org.example.plist"), std::string::npos);
  test::makeFolder(folder / "org.example.plist");  // a folder in the way of the rename
  EXPECT_TRUE(PreferencesStore(folder.path()).write("org.example", {}));
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder.path()), {}), 1);
}

}  // namespace
}  // namespace brivo
