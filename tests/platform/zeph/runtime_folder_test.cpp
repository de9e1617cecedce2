// SPDX-License-Identifier: MIT
#include "platform/zeph/runtime_folder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <unistd.h>
#include <future>

#include "support/temporary_folder.h"

namespace brivo::zeph {
namespace {

using testing::HasSubstr;

TEST(RuntimeFolderTest, IsMadeForThisUserAlone) {
  const test::TemporaryFolder parent;
  const auto folder = RuntimeFolder::claim(parent / "brivod");
  ASSERT_TRUE(folder.ok()) << folder.error().text();
  struct stat status {};
  ASSERT_EQ(::stat((parent / "brivod").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
}

TEST(RuntimeFolderTest, AFolderThatWasOpenToOthersIsClosed) {
  const test::TemporaryFolder parent;
  test::makeFolder(parent / "brivod");
  ::chmod((parent / "brivod").c_str(), 0777);
  ASSERT_TRUE(RuntimeFolder::claim(parent / "brivod").ok());
  struct stat status {};
  ASSERT_EQ(::stat((parent / "brivod").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777, 0700u);
}

TEST(RuntimeFolderTest, OneServiceAtATime) {
  const test::TemporaryFolder parent;
  {
    const auto first = RuntimeFolder::claim(parent.path());
    ASSERT_TRUE(first.ok());
    const auto second = RuntimeFolder::claim(parent.path());
    ASSERT_FALSE(second.ok());
    EXPECT_THAT(second.error().text(), HasSubstr("another service"));
  }
  EXPECT_TRUE(RuntimeFolder::claim(parent.path()).ok()) << "the claim goes with its holder";
}

TEST(RuntimeFolderTest, WhoHasPatienceGetsItWhenTheFirstHasEnded) {
  const test::TemporaryFolder parent;
  auto first = RuntimeFolder::claim(parent.path());
  ASSERT_TRUE(first.ok());
  EXPECT_FALSE(RuntimeFolder::claim(parent.path(), std::chrono::milliseconds(20)).ok());
  auto second = std::async(
      std::launch::async, [&] { return RuntimeFolder::claim(parent.path(), std::chrono::seconds(20)).ok(); });
  first->reset();
  EXPECT_TRUE(second.get());
}

TEST(RuntimeFolderTest, SocketsOfAServiceThatDiedAreRemoved) {
  const test::TemporaryFolder parent;
  test::writeFile(parent / "device-0", "");
  test::writeFile(parent / "manager", "");
  ASSERT_TRUE(RuntimeFolder::claim(parent.path()).ok());
  EXPECT_NE(::access((parent / "device-0").c_str(), F_OK), 0);
  EXPECT_EQ(::access((parent / "manager").c_str(), F_OK), 0);
}

TEST(RuntimeFolderTest, WhatCannotBeAFolderIsAnErrorThatSaysSo) {
  const test::TemporaryFolder parent;
  test::writeFile(parent / "file", "");
  EXPECT_THAT(RuntimeFolder::claim(parent / "file").error().text(), HasSubstr(parent / "file"));
  EXPECT_FALSE(RuntimeFolder::claim(parent / "a/b").ok());
  EXPECT_THAT(RuntimeFolder::claim("").error().text(), HasSubstr("XDG_RUNTIME_DIR"));
}

}  // namespace
}  // namespace brivo::zeph
