// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "platform/base/mapping.h"
#include "platform/base/unique_fd.h"

namespace brivo {
namespace {

bool isOpen(int fd) { return ::fcntl(fd, F_GETFD) >= 0; }

TEST(UniqueFdTest, ClosesOnceAndOnlyWhatItOwns) {
  const int raw = ::open("/dev/null", O_RDONLY | O_CLOEXEC);
  {
    UniqueFd first(raw);
    UniqueFd second = std::move(first);
    EXPECT_FALSE(first);
    EXPECT_TRUE(isOpen(second.get()));
  }
  EXPECT_FALSE(isOpen(raw));
}

TEST(UniqueFdTest, ADuplicateIsADescriptorOfItsOwn) {
  UniqueFd first(::open("/dev/null", O_RDONLY | O_CLOEXEC));
  UniqueFd second = first.duplicate();
  EXPECT_NE(first.get(), second.get());
  first.reset();
  EXPECT_TRUE(isOpen(second.get()));
  EXPECT_EQ(::fcntl(second.get(), F_GETFD) & FD_CLOEXEC, FD_CLOEXEC);
}

TEST(UniqueFdTest, ADuplicateOfNothingIsNothing) { EXPECT_FALSE(UniqueFd().duplicate()); }

TEST(MappingTest, AnonymousMemoryIsZeroedAndWritable) {
  const Mapping mapping = Mapping::anonymous(5000);
  ASSERT_TRUE(mapping);
  EXPECT_EQ(mapping.size(), 5000u);
  EXPECT_EQ(mapping.bytes()[4999], std::byte{0});
  mapping.bytes()[4999] = std::byte{1};
}

TEST(MappingTest, NothingMapsToNothing) {
  EXPECT_FALSE(Mapping::anonymous(0));
  EXPECT_FALSE(Mapping::sharedReadable(-1, 10));
}

TEST(MappingTest, MovingMovesTheRegion) {
  Mapping first = Mapping::anonymous(10);
  const auto* address = first.bytes().data();
  Mapping second;
  second = std::move(first);
  EXPECT_EQ(second.bytes().data(), address);
}

}  // namespace
}  // namespace brivo
