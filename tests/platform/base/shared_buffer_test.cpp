// SPDX-License-Identifier: MIT
#include "platform/base/shared_buffer.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include "platform/base/mapping.h"
#include "platform/base/unique_fd.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

UniqueFd memfd(std::size_t size, int seals) {
  UniqueFd fd(::memfd_create("test", MFD_CLOEXEC | MFD_ALLOW_SEALING));
  EXPECT_EQ(::ftruncate(fd.get(), static_cast<off_t>(size)), 0);
  EXPECT_EQ(::fcntl(fd.get(), F_ADD_SEALS, seals), 0);
  return fd;
}

TEST(SharedBufferTest, WhatOneSideWritesTheOtherReads) {
  const auto buffer = SharedBuffer::create("test", 10'000);
  ASSERT_TRUE(buffer);
  const SharedBuffer received(UniqueFd(::fcntl(buffer->fd(), F_DUPFD_CLOEXEC, 0)), buffer->size());
  EXPECT_EQ(received.identity(), buffer->identity());
  EXPECT_FALSE(received == *buffer);
  const Mapping ours = buffer->mapped(10'000);
  const Mapping theirs = received.mapped(5'000);
  theirs.bytes()[4'999] = std::byte{7};
  EXPECT_EQ(ours.bytes()[4'999], std::byte{7});
}

TEST(SharedBufferTest, OnlyAMemfdThatCannotShrinkAndHoldsWhatItIsSaidToIsMapped) {
  EXPECT_TRUE(SharedBuffer(memfd(5'000, F_SEAL_SHRINK), 5'000).mapped(5'000));
  EXPECT_FALSE(SharedBuffer(memfd(5'000, 0), 5'000).mapped(5'000)) << "not sealed";
  EXPECT_FALSE(SharedBuffer(memfd(5'000, F_SEAL_GROW), 5'000).mapped(5'000)) << "sealed otherwise";
  EXPECT_FALSE(SharedBuffer(memfd(5'000, F_SEAL_SHRINK), 5'001).mapped(1)) << "smaller than said";
  EXPECT_FALSE(SharedBuffer(memfd(5'000, F_SEAL_SHRINK), UINT64_MAX).mapped(1)) << "absurd";
  EXPECT_FALSE(SharedBuffer(memfd(5'000, F_SEAL_SHRINK), 4'000).mapped(4'001)) << "more than lent";
  EXPECT_FALSE(SharedBuffer(memfd(5'000, F_SEAL_SHRINK | F_SEAL_WRITE), 5'000).mapped(1)) << "not writable";
}

TEST(SharedBufferTest, OtherDescriptorsAreNotMapped) {
  const test::TemporaryFolder folder;
  test::writeFile(folder / "file", std::string(5'000, 'x'));
  int ends[2];
  ASSERT_EQ(::pipe(ends), 0);
  const UniqueFd writeEnd(ends[1]);
  EXPECT_FALSE(SharedBuffer(UniqueFd(::open((folder / "file").c_str(), O_RDWR | O_CLOEXEC)), 100).mapped(1));
  EXPECT_FALSE(SharedBuffer(UniqueFd(ends[0]), 100).mapped(1));
  EXPECT_FALSE(SharedBuffer(UniqueFd(), 100).mapped(1));
  EXPECT_FALSE(SharedBuffer(UniqueFd(), 100).identity());
}

}  // namespace
}  // namespace brivo
