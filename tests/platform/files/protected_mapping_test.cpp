// SPDX-License-Identifier: MIT
#include "platform/files/protected_mapping.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <thread>
#include <vector>

#include "platform/base/unique_fd.h"
#include "support/mounts.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

constexpr std::size_t kMegabyte = 1'048'576;

class ProtectedMappingTest : public testing::Test {
 protected:
  UniqueFd file(std::size_t size, char fill = 'x') {
    test::writeFile(path, std::string(size, fill));
    return UniqueFd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  }
  static bool isAll(std::span<const std::byte> bytes, char value) {
    return std::ranges::all_of(bytes, [&](std::byte byte) { return byte == static_cast<std::byte>(value); });
  }
  test::TemporaryFolder folder;
  const std::string path = folder / "IMG_0001.CR2";
};

TEST_F(ProtectedMappingTest, BytesFromAnyOffsetOn) {
  test::writeFile(path, std::string(5'000, 'a') + std::string(5'000, 'b'));
  const UniqueFd fd(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
  const auto mapping = ProtectedMapping::map(fd.get(), 2'000, 4'000);
  ASSERT_TRUE(mapping);
  ASSERT_EQ(mapping->bytes().size(), 2'000u);
  EXPECT_TRUE(isAll(mapping->bytes().first(1'000), 'a'));
  EXPECT_TRUE(isAll(mapping->bytes().subspan(1'000), 'b'));
  EXPECT_FALSE(mapping->faulted());
}

TEST_F(ProtectedMappingTest, NothingIsMappedOfAnEmptyRangeOrWithoutAFile) {
  const UniqueFd fd = file(100);
  EXPECT_FALSE(ProtectedMapping::map(fd.get(), 0, 0));
  EXPECT_FALSE(ProtectedMapping::map(-1, 10, 0));
  EXPECT_FALSE(ProtectedMapping::map(fd.get(), SIZE_MAX, 5));
  EXPECT_FALSE(ProtectedMapping::map(fd.get(), 10, UINT64_MAX));
}

TEST_F(ProtectedMappingTest, ATruncatedFileReadsAsZerosOnSeveralThreads) {
  const UniqueFd fd = file(8 * kMegabyte);
  const auto mapping = ProtectedMapping::map(fd.get(), 8 * kMegabyte, 0);
  ASSERT_TRUE(mapping);
  ASSERT_EQ(::truncate(path.c_str(), kMegabyte), 0);
  std::vector<std::thread> readers;
  for (std::size_t reader = 0; reader < 4; ++reader) {
    readers.emplace_back([&, reader] {
      EXPECT_TRUE(isAll(mapping->bytes().subspan((1 + reader) * kMegabyte, kMegabyte), 0));
    });
  }
  for (auto& reader : readers) reader.join();
  EXPECT_TRUE(mapping->faulted());
}

TEST_F(ProtectedMappingTest, WhatWasMappedBeforeTheFaultStays) {
  const UniqueFd fd = file(4 * kMegabyte);
  const auto mapping = ProtectedMapping::map(fd.get(), 4 * kMegabyte, 0);
  const auto other = ProtectedMapping::map(fd.get(), kMegabyte, 0);
  ASSERT_EQ(::truncate(path.c_str(), 2 * kMegabyte), 0);
  EXPECT_TRUE(isAll(mapping->bytes().subspan(3 * kMegabyte), 0));
  EXPECT_TRUE(isAll(mapping->bytes().first(2 * kMegabyte), 'x'));
  EXPECT_TRUE(isAll(other->bytes(), 'x'));
  EXPECT_FALSE(other->faulted());
}

TEST_F(ProtectedMappingTest, AnImageYankedFromUnderAMountReadsAsZerosOnSeveralThreads) {
  if (!test::enterMountNamespace()) GTEST_SKIP() << "needs root";
  const test::LoopMount card(folder / "CARD", 32);
  test::writeFile(card.point() + "/MVI_0001.MOV", std::string(8 * kMegabyte, 'x'));
  const UniqueFd fd(::open((card.point() + "/MVI_0001.MOV").c_str(), O_RDONLY | O_CLOEXEC));
  ASSERT_EQ(::fsync(fd.get()), 0);
  ASSERT_EQ(::posix_fadvise(fd.get(), 0, 0, POSIX_FADV_DONTNEED), 0);
  const auto mapping = ProtectedMapping::map(fd.get(), 8 * kMegabyte, 0);
  ASSERT_TRUE(mapping);
  card.yank();
  std::vector<std::thread> readers;
  for (std::size_t reader = 0; reader < 4; ++reader) {
    readers.emplace_back([&, reader] {
      EXPECT_TRUE(isAll(mapping->bytes().subspan(reader * 2 * kMegabyte, 2 * kMegabyte), 0));
    });
  }
  for (auto& reader : readers) reader.join();
  EXPECT_TRUE(mapping->faulted());
}

TEST_F(ProtectedMappingTest, ASystemCallThatIsGivenALostPageSaysSo) {
  const UniqueFd fd = file(kMegabyte);
  const auto mapping = ProtectedMapping::map(fd.get(), kMegabyte, 0);
  ASSERT_EQ(::truncate(path.c_str(), 0), 0);
  const UniqueFd sink(::open((folder / "sink").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
  EXPECT_EQ(::write(sink.get(), mapping->bytes().data(), 100), -1);
  EXPECT_EQ(errno, EFAULT);
}

TEST_F(ProtectedMappingTest, ManyMappingsComeAndGoAndThereIsAMost) {
  const UniqueFd fd = file(10'000);
  for (int round = 0; round < 2; ++round) {
    std::vector<std::unique_ptr<ProtectedMapping>> many;
    while (auto mapping = ProtectedMapping::map(fd.get(), 10'000, 0)) many.push_back(std::move(mapping));
    EXPECT_EQ(errno, EMFILE);
    EXPECT_EQ(many.size(), ProtectedMapping::kMost);
  }
}

using ProtectedMappingDeathTest = ProtectedMappingTest;

TEST_F(ProtectedMappingDeathTest, AFaultElsewhereEndsTheProcessAsEver) {
  testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_DEATH(
      {
        const UniqueFd fd = file(kMegabyte);
        const auto mapping = ProtectedMapping::map(fd.get(), kMegabyte, 0);
        auto* bare =
            static_cast<volatile char*>(::mmap(nullptr, kMegabyte, PROT_READ, MAP_SHARED, fd.get(), 0));
        (void)::truncate(path.c_str(), 0);
        (void)bare[0];
      },
      "");
}

}  // namespace
}  // namespace brivo
