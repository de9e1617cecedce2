// SPDX-License-Identifier: MIT
#include "platform/base/data.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>

#include "platform/base/memory_file.h"

namespace brivo {
namespace {

TEST(DataTest, CopiesShareTheBytes) {
  const Data first = Data::copyOf("abc");
  const Data second = first;
  EXPECT_EQ(first.bytes().data(), second.bytes().data());
  EXPECT_EQ(second.text(), "abc");
  EXPECT_EQ(second.memfd(), -1);
}

TEST(DataTest, TheLastCopyRunsTheReleaseAction) {
  static const std::byte byte{7};
  int released = 0;
  {
    const Data data(std::span(&byte, 1),
                    std::shared_ptr<const void>(&byte, [&](const void*) { ++released; }));
    { const Data copy = data; }
    EXPECT_EQ(released, 0);
  }
  EXPECT_EQ(released, 1);
}

TEST(MemoryFileTest, SealedBytesCanBeReadThroughTheDescriptor) {
  auto file = MemoryFile::create("test", 100);
  ASSERT_TRUE(file);
  std::ranges::fill(file->bytes(), std::byte{'x'});
  const auto data = std::move(*file).seal(40);
  ASSERT_TRUE(data);
  EXPECT_EQ(data->size(), 40u);
  char read[40];
  ASSERT_EQ(::pread(data->memfd(), read, sizeof read, 0), 40);
  EXPECT_EQ(std::string_view(read, 40), data->text());
}

TEST(MemoryFileTest, TheSealsForbidShrinkingGrowingAndNewWritableMappings) {
  auto file = MemoryFile::create("test", 4096);
  ASSERT_TRUE(file);
  const auto data = std::move(*file).seal(4096);
  ASSERT_TRUE(data);
  EXPECT_NE(::ftruncate(data->memfd(), 10), 0);
  EXPECT_NE(::ftruncate(data->memfd(), 8192), 0);
  EXPECT_EQ(::mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_SHARED, data->memfd(), 0), MAP_FAILED);
  EXPECT_NE(::pwrite(data->memfd(), "y", 1, 0), 1);
}

TEST(MemoryFileTest, AForeignMemfdIsTakenOnlyWhenItCannotShrink) {
  UniqueFd unsealed(::memfd_create("test", MFD_CLOEXEC | MFD_ALLOW_SEALING));
  ASSERT_EQ(::ftruncate(unsealed.get(), 64), 0);
  UniqueFd sealed = unsealed.duplicate();
  EXPECT_FALSE(dataFromSealedMemfd(std::move(unsealed), 64));
  ASSERT_EQ(::fcntl(sealed.get(), F_ADD_SEALS, F_SEAL_SHRINK), 0);
  EXPECT_FALSE(dataFromSealedMemfd(sealed.duplicate(), 65)) << "more than the file holds";
  const auto data = dataFromSealedMemfd(std::move(sealed), 64);
  ASSERT_TRUE(data);
  EXPECT_EQ(data->size(), 64u);
}

TEST(MemoryFileTest, AnOrdinaryFileIsNotTaken) {
  UniqueFd pipeEnds[2];
  int raw[2];
  ASSERT_EQ(::pipe(raw), 0);
  pipeEnds[0].reset(raw[0]);
  pipeEnds[1].reset(raw[1]);
  EXPECT_FALSE(dataFromSealedMemfd(std::move(pipeEnds[0]), 1));
}

}  // namespace
}  // namespace brivo
