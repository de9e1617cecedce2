// SPDX-License-Identifier: MIT
#include "platform/base/memory_pool.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstring>
#include <set>
#include <vector>

namespace brivo {
namespace {

constexpr std::size_t kSize = 8192;

class MemoryPoolTest : public testing::Test {
 protected:
  Data sent(char fill) {
    auto block = pool->take();
    EXPECT_TRUE(block);
    std::ranges::fill(block->bytes(), static_cast<std::byte>(fill));
    return std::move(*block).send(kSize);
  }
  static ino_t fileOf(const Data& data) {
    struct stat status {};
    EXPECT_EQ(::fstat(data.memfd(), &status), 0);
    return status.st_ino;
  }
  std::shared_ptr<MemoryPool> pool = MemoryPool::create("test", kSize, 2);
};

TEST_F(MemoryPoolTest, ABlockThatNobodyHasAnyMoreIsUsedAgain) {
  const ino_t first = fileOf(sent('a'));
  EXPECT_EQ(fileOf(sent('b')), first);
}

TEST_F(MemoryPoolTest, ABlockIsLeftAloneWhileADescriptorOrAMappingOrAMessageHoldsIt) {
  int pair[2];
  ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM, 0, pair), 0);
  const UniqueFd near(pair[0]);
  UniqueFd far(pair[1]);
  UniqueFd descriptor;
  ino_t first = 0;
  {
    const Data data = sent('a');
    first = fileOf(data);
    descriptor.reset(::fcntl(data.memfd(), F_DUPFD_CLOEXEC, 0));
  }
  EXPECT_NE(fileOf(sent('b')), first) << "a descriptor is open";
  Mapping mapping = Mapping::sharedReadable(descriptor.get(), kSize);
  ASSERT_TRUE(mapping);

  char byte = 'x';
  iovec part{&byte, 1};
  alignas(cmsghdr) char control[CMSG_SPACE(sizeof(int))] = {};
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control;
  message.msg_controllen = sizeof control;
  cmsghdr* header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof(int));
  const int raw = descriptor.get();
  std::memcpy(CMSG_DATA(header), &raw, sizeof raw);
  ASSERT_EQ(::sendmsg(near.get(), &message, 0), 1);
  descriptor.reset();
  EXPECT_NE(fileOf(sent('c')), first) << "a mapping is there";
  EXPECT_EQ(mapping.bytes().front(), std::byte{'a'});
  mapping = Mapping();
  EXPECT_NE(fileOf(sent('d')), first) << "a message holds it";
  far.reset();
  EXPECT_TRUE((std::set{fileOf(sent('e'))}.contains(first)));
}

TEST_F(MemoryPoolTest, WhatIsSentIsReadOnlyAndSealed) {
  const Data data = sent('a');
  EXPECT_EQ(::fcntl(data.memfd(), F_GETFL) & O_ACCMODE, O_RDONLY);
  EXPECT_EQ(::ftruncate(data.memfd(), 0), -1);
  EXPECT_EQ(::mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_SHARED, data.memfd(), 0), MAP_FAILED);
  const UniqueFd writable(
      ::open(("/proc/self/fd/" + std::to_string(data.memfd())).c_str(), O_RDWR | O_CLOEXEC));
  ASSERT_TRUE(writable);
  EXPECT_EQ(::mmap(nullptr, kSize, PROT_READ | PROT_WRITE, MAP_SHARED, writable.get(), 0), MAP_FAILED);
  EXPECT_EQ(::pwrite(writable.get(), "x", 1, 0), -1);
  EXPECT_EQ(::fcntl(data.memfd(), F_GET_SEALS) & (F_SEAL_SHRINK | F_SEAL_GROW), F_SEAL_SHRINK | F_SEAL_GROW);
}

TEST_F(MemoryPoolTest, SomebodyWhoOpenedItForWritingKeepsItForGood) {
  UniqueFd writable;
  ino_t first = 0;
  {
    const Data data = sent('a');
    first = fileOf(data);
    writable.reset(::open(("/proc/self/fd/" + std::to_string(data.memfd())).c_str(), O_RDWR | O_CLOEXEC));
    ASSERT_TRUE(writable);
  }
  EXPECT_NE(fileOf(sent('b')), first);
}

TEST_F(MemoryPoolTest, NoMoreThanIsToBeKeptIsKept) {
  std::set<ino_t> files;
  {
    std::vector<Data> many;
    for (int i = 0; i < 10; ++i) many.push_back(sent('x'));
    for (const Data& data : many) files.insert(fileOf(data));
    EXPECT_EQ(files.size(), 10u);
  }
  std::vector<Data> again;
  int reused = 0;
  for (int i = 0; i < 10; ++i) {
    again.push_back(sent('y'));
    if (files.contains(fileOf(again.back()))) ++reused;
  }
  EXPECT_GE(reused, 2);
}

TEST_F(MemoryPoolTest, ABlockThatIsDroppedUnsentGoesBack) {
  const void* first = pool->take()->bytes().data();
  EXPECT_EQ(pool->take()->bytes().data(), first);
  pool->trim();
}

TEST_F(MemoryPoolTest, DataOutlivesThePool) {
  const Data data = sent('a');
  pool.reset();
  EXPECT_EQ(data.text(), std::string(kSize, 'a'));
}

}  // namespace
}  // namespace brivo
