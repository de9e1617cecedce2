// SPDX-License-Identifier: MIT
#include "platform/zeph/signal_batch.h"

#include <gtest/gtest.h>
#include <sys/socket.h>

#include <array>

#include "platform/base/byte_cursor.h"
#include "platform/base/unique_fd.h"

namespace brivo::zeph {
namespace {

constexpr const char* kInterface = "org.orvid.Test";
constexpr Member kNote{"note:", Member::Kind::signal, "a{sv}", "", "note,"};
constexpr Member kPercent{"percent:", Member::Kind::signal, "u", "", "percent,"};

OutgoingSignal signalOf(const Member& member, Value argument) {
  return {&member, std::make_shared<const Arguments>(Arguments{std::move(argument)})};
}

/// Two connected sockets; the first has room for little.
class SignalBatchTest : public testing::Test {
 protected:
  SignalBatchTest() {
    std::array<int, 2> ends{};
    EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()), 0);
    ours = UniqueFd(ends[0]);
    theirs = UniqueFd(ends[1]);
  }
  /// What has arrived so far.
  std::string received() const {
    std::string text(1 << 20, '\0');
    const ssize_t count = ::recv(theirs.get(), text.data(), text.size(), MSG_DONTWAIT);
    text.resize(count > 0 ? static_cast<std::size_t>(count) : 0);
    return text;
  }

  UniqueFd ours, theirs;
  SignalBatch batch;
};

TEST_F(SignalBatchTest, ASignalIsAMessageOfTheStandard) {
  ASSERT_TRUE(batch.append(signalOf(kPercent, std::uint32_t{42}), kInterface, 10));
  EXPECT_EQ(batch.writeTo(ours.get()), SignalBatch::Written::all);
  const std::string text = received();
  ByteCursor message(std::as_bytes(std::span(text)));
  EXPECT_EQ(message.u32(), 'l' | 4U << 8 | 1U << 16 | 1U << 24)
      << "little-endian, a signal, no reply, version 1";
  EXPECT_EQ(message.u32(), 4u) << "length of the body";
  EXPECT_EQ(message.u32(), 0x80000001u) << "apart from the serial numbers of others";
  const std::uint32_t fields = message.u32();
  EXPECT_EQ(text.size(), (16 + fields + 7) / 8 * 8 + 4);
  for (const char* field : {"/org/orvid/brivod", kInterface, "percent", ":1.0"})
    EXPECT_NE(text.find(field), std::string::npos) << field;
  EXPECT_EQ(text.substr(text.size() - 4), std::string("\x2A\0\0\0", 4));
}

TEST_F(SignalBatchTest, ArgumentsThatDoNotFitAppendNothing) {
  EXPECT_FALSE(batch.append(signalOf(kNote, "no dictionary"), kInterface, 10));
  EXPECT_FALSE(batch.append(signalOf(kPercent, "no number"), kInterface, 10));
  EXPECT_TRUE(batch.empty());
  EXPECT_EQ(batch.writeTo(ours.get()), SignalBatch::Written::all);
  EXPECT_EQ(received(), "");
}

TEST_F(SignalBatchTest, WhatASlowPeerDoesNotTakeWaitsAndGoesOnInOrder) {
  constexpr int kCount = 400;
  for (int i = 0; i < kCount; ++i) {
    const Dictionary note{{"number", i}, {"text", std::string(2000, 'x')}};
    ASSERT_TRUE(batch.append(signalOf(kNote, note), kInterface, 1));
  }
  EXPECT_TRUE(batch.isFull());
  EXPECT_EQ(batch.writeTo(ours.get()), SignalBatch::Written::some) << "more than a socket holds";
  std::size_t left = batch.takeLeft().messages;
  EXPECT_LT(left, kCount);
  std::string all;
  while (!batch.empty()) {
    all += received();
    batch.writeTo(ours.get());
    left += batch.takeLeft().messages;
  }
  all += received();
  EXPECT_EQ(left, kCount);
  EXPECT_FALSE(batch.isInsideMessage());
  const std::size_t one = all.size() / kCount;
  ASSERT_EQ(all.size(), one * kCount);
  for (std::uint32_t i = 0; i < kCount; ++i) {
    ByteCursor message(std::as_bytes(std::span(all)).subspan(i * one));
    message.skip(8);
    ASSERT_EQ(message.u32(), 0x80000001u + i);
  }
}

TEST_F(SignalBatchTest, APeerThatHungUpIsNoticed) {
  theirs = UniqueFd();
  ASSERT_TRUE(batch.append(signalOf(kPercent, std::uint32_t{1}), kInterface, 10));
  EXPECT_EQ(batch.writeTo(ours.get()), SignalBatch::Written::hungUp);
}

}  // namespace
}  // namespace brivo::zeph
