// SPDX-License-Identifier: MIT
#include "platform/base/small_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include "platform/base/unique_fd.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

class SmallFileTest : public testing::Test {
 protected:
  std::optional<std::string> read(const std::string& path) {
    return readSmallFile(UniqueFd(::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC)).get(), 10'000);
  }

  test::TemporaryFolder folder;
};

TEST_F(SmallFileTest, AFileIsReadWholeUpToTheLimit) {
  for (const std::size_t size : {std::size_t{0}, std::size_t{1}, std::size_t{4096}, std::size_t{10'000}}) {
    const std::string content(size, 'x');
    test::writeFile(folder / "file", content);
    EXPECT_EQ(read(folder / "file"), content) << size;
  }
  test::writeFile(folder / "file", std::string(10'001, 'x'));
  EXPECT_EQ(read(folder / "file"), std::nullopt);
}

TEST_F(SmallFileTest, AFileOfTheKernelThatDoesNotTellItsSizeIsRead) {
  EXPECT_TRUE(read("/proc/self/status").value_or("").starts_with("Name:"));
}

TEST_F(SmallFileTest, WhatIsNoRegularFileIsNone) {
  ASSERT_EQ(::mkfifo((folder / "fifo").c_str(), 0600), 0);
  EXPECT_EQ(read(folder / "fifo"), std::nullopt);
  EXPECT_EQ(read(folder.path()), std::nullopt);
  EXPECT_EQ(read("/dev/zero"), std::nullopt);
  EXPECT_EQ(read(folder / "none"), std::nullopt);
}

}  // namespace
}  // namespace brivo
