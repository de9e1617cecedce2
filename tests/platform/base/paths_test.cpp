// SPDX-License-Identifier: MIT
#include "platform/base/paths.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(PathsTest, LastPathComponent) {
  EXPECT_EQ(lastPathComponent("/media/CARD"), "CARD");
  EXPECT_EQ(lastPathComponent("/media/CARD/"), "CARD");
  EXPECT_EQ(lastPathComponent("CARD"), "CARD");
  EXPECT_EQ(lastPathComponent("/"), "/");
  EXPECT_EQ(lastPathComponent(""), "");
}

TEST(PathsTest, PathExtension) {
  EXPECT_EQ(pathExtension("/V/IMG_0001.JPG"), "JPG");
  EXPECT_EQ(pathExtension("archive.tar.gz"), "gz");
  EXPECT_EQ(pathExtension("README"), "");
  EXPECT_EQ(pathExtension("IMG_0001."), "");
  EXPECT_EQ(pathExtension(".profile"), "");
  EXPECT_EQ(pathExtension("/a.b/c"), "");
}

TEST(PathsTest, DeletingPathExtension) {
  EXPECT_EQ(deletingPathExtension("/V/IMG_0001.JPG"), "/V/IMG_0001");
  EXPECT_EQ(deletingPathExtension("README"), "README");
  EXPECT_EQ(deletingPathExtension(".profile"), ".profile");
  EXPECT_EQ(deletingPathExtension("/a.b/c"), "/a.b/c");
}

TEST(PathsTest, ParentPath) {
  EXPECT_EQ(parentPath("/a/b/c"), "/a/b");
  EXPECT_EQ(parentPath("/a"), "/");
  EXPECT_EQ(parentPath("a"), "");
}

TEST(PathsTest, AppendingPathComponentPutsOneSlashBetween) {
  EXPECT_EQ(appendingPathComponent("/V", "DCIM"), "/V/DCIM");
  EXPECT_EQ(appendingPathComponent("/", "DCIM"), "/DCIM");
  EXPECT_EQ(appendingPathComponent("/V/", "DCIM"), "/V/DCIM");
}

TEST(PathsTest, IsAtOrBelowCountsWholeComponents) {
  EXPECT_TRUE(isAtOrBelow("/media/a", "/media"));
  EXPECT_TRUE(isAtOrBelow("/media", "/media/"));
  EXPECT_FALSE(isAtOrBelow("/media2", "/media"));
  EXPECT_TRUE(isAtOrBelow("/anything", "/"));
}

}  // namespace
}  // namespace brivo
