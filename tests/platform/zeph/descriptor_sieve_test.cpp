// SPDX-License-Identifier: MIT
// Peers that send descriptors, where the kernel lets them.
#include "platform/zeph/descriptor_sieve.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <filesystem>

#include "platform/base/memory_file.h"
#include "platform/zeph/pass_rights.h"
#include "support/raw_dbus.h"
#include "support/wait.h"
#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

using test::authentication;
using test::connectRaw;
using test::hangsUp;
using test::marshalledString;
using test::methodCall;
using test::openDescriptorCount;
using test::receive;
using test::sendAll;
using test::sendWithDescriptors;
using test::waitUntil;
using testing::HasSubstr;

constexpr std::size_t kMostOfOneMessage = 253;  // for Linux
constexpr const char* kPing = "org.freedesktop.DBus.Peer";
constexpr std::size_t kAuthenticated = 52;  // bytes of the answer
constexpr std::size_t kPong = 40;

/// The descriptor of this process that listens at `path`.
int listeningAt(const std::string& path) {
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    const int fd = std::stoi(entry.path().filename());
    int listens = 0;
    socklen_t size = sizeof listens;
    sockaddr_un address{};
    socklen_t length = sizeof address;
    if (::getsockopt(fd, SOL_SOCKET, SO_ACCEPTCONN, &listens, &size) == 0 && listens != 0 &&
        ::getsockname(fd, reinterpret_cast<sockaddr*>(&address), &length) == 0 &&
        std::string(address.sun_path).starts_with(path)) {
      return fd;
    }
  }
  return -1;
}

class SieveTest : public EchoTest {
 protected:
  SieveTest() {
    // What kernels do that cannot refuse descriptors, and that do not know the option.
    constexpr int yes = 1;
    const int listening = listeningAt(socketPath());
    EXPECT_GE(listening, 0);
    ::setsockopt(listening, SOL_SOCKET, SO_PASSRIGHTS, &yes, sizeof yes);
    witness = connectClient();
    EXPECT_TRUE(echo(witness, {}).ok());
    service->handled = 0;
  }
  ~SieveTest() override { EXPECT_TRUE(echo(witness, {}).ok()) << "the others notice nothing"; }

  UniqueFd authenticated() {
    UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication());
    EXPECT_THAT(receive(raw.get(), kAuthenticated), HasSubstr("AGREE_UNIX_FD"));
    return raw;
  }
  /// The beginning of a message that promises much, and `times` one byte more with descriptors. True when the
  /// service hangs up.
  bool endsAfterDescriptors(std::size_t times) {
    const UniqueFd raw = authenticated();
    std::string message = methodCall(1, kEchoInterface, "hold");
    message[6] = 1;  // a body of 64 KiB
    sendAll(raw.get(), message);
    for (std::size_t i = 0; i < times; ++i) {
      if (!sendWithDescriptors(raw.get(), "x", kMostOfOneMessage)) break;
    }
    return hangsUp(raw.get());
  }
  void expectOneFaultPer(std::size_t peers) {
    EXPECT_TRUE(waitUntil([&] {
      const std::lock_guard lock(faultsMutex);
      return faults.size() == peers;
    }));
    const std::lock_guard lock(faultsMutex);
    for (const std::string& line : faults) EXPECT_THAT(line, HasSubstr("descriptors"));
  }

  std::shared_ptr<Connection> witness;
};

TEST_F(SieveTest, DescriptorsOfAMessageThatNeverEndsEndTheConnectionAndAreClosed) {
  const std::size_t before = openDescriptorCount();
  for (int i = 0; i < 10; ++i) EXPECT_TRUE(endsAfterDescriptors(20));
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= before; }));
  expectOneFaultPer(10);
}

TEST_F(SieveTest, DescriptorsDuringAuthenticationEndTheConnectionAndAreClosed) {
  const std::size_t before = openDescriptorCount();
  const std::string lines = authentication();
  for (const std::size_t split : {std::size_t{1}, std::size_t{10}, lines.size() - 1}) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), lines.substr(0, split));
    EXPECT_TRUE(sendWithDescriptors(raw.get(), lines.substr(split), kMostOfOneMessage));
    EXPECT_TRUE(hangsUp(raw.get())) << split;
  }
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= before; }));
}

TEST_F(SieveTest, WhatHonestPeersSendComesThroughWholeAndInOrder) {
  const Dictionary large{{"bytes", Data::copyOf(std::string(60'000, 'b'))},
                         {"text", std::string(1 << 20, 't')}};
  auto file = MemoryFile::create("test", 1 << 20);
  service->data = *std::move(*file).seal(1 << 20);
  for (int i = 0; i < 20; ++i) {
    const Answer answer = echo(witness, large);
    ASSERT_TRUE(answer.ok()) << answer.error().text;
    EXPECT_EQ(*answer->front().get<Dictionary>(), large);
  }
  const Answer fetched = call(witness, "fetch", {});
  ASSERT_TRUE(fetched.ok());
  EXPECT_GE(fetched->front().get<Dictionary>()->data("data")->memfd(), 0)
      << "descriptors go to peers as ever";
}

TEST_F(SieveTest, CallsThatComeWithTheEndOfTheAuthenticationAndBehindItAreServed) {
  const UniqueFd raw = connectRaw(socketPath());
  std::string calls = authentication();
  for (std::uint32_t i = 1; i <= 300; ++i) calls += methodCall(i, kPing, "Ping");
  sendAll(raw.get(), calls);
  constexpr std::size_t answers = kAuthenticated + 300 * kPong;
  EXPECT_EQ(receive(raw.get(), answers).size(), answers);
}

TEST_F(SieveTest, AHangUpWithAnswersPendingIsNoFault) {
  for (int i = 0; i < 50; ++i) {
    const UniqueFd raw = connectRaw(socketPath());
    std::string calls = authentication();
    for (std::uint32_t serial = 1; serial <= 20; ++serial) calls += methodCall(serial, kPing, "Ping");
    sendAll(raw.get(), calls);
  }
  EXPECT_TRUE(echo(witness, {}).ok());
  const std::lock_guard lock(faultsMutex);
  EXPECT_TRUE(faults.empty()) << faults.front();
}

class LendingTest : public SieveTest {
 protected:
  LendingTest() { service->acceptsBuffers = true; }

  /// A dictionary with `count` references to the first descriptor of the message.
  static std::string buffers(int count) {
    std::string entries(8, '\0');  // stands for the array's length and what aligns its first entry
    for (int i = 0; i < count; ++i) {
      entries.resize((entries.size() + 7) / 8 * 8);
      entries += marshalledString("buffer" + std::to_string(i));
      entries += std::string("\x04(ht)\0", 6);
      entries.resize((entries.size() + 7) / 8 * 8);
      entries += std::string(8, '\0') + std::string("\0\x10\0\0\0\0\0\0", 8);
    }
    entries[0] = static_cast<char>((entries.size() - 8) & 0xFF);
    entries[1] = static_cast<char>((entries.size() - 8) >> 8);
    return entries;
  }
  static std::string lendingCall(std::uint32_t serial, const char* member, int count = 1) {
    return methodCall(serial, kEchoInterface, member, "a{sv}", buffers(count), 1);
  }
};

TEST_F(LendingTest, ABufferPerCallIsTakenForAsLongAsThePeerLikes) {
  const std::size_t before = openDescriptorCount();
  {
    const UniqueFd raw = authenticated();
    for (std::uint32_t i = 1; i <= 100; ++i) {
      ASSERT_TRUE(sendWithDescriptors(raw.get(), lendingCall(i, "echo_withReply"), 1));
      ASSERT_FALSE(receive(raw.get(), 1).empty());
    }
    EXPECT_TRUE(waitUntil([&] { return service->handled == 100; }));
  }
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= before; }));
}

TEST_F(LendingTest, TwoBuffersInOneCallAreInvalidArgs) {
  const UniqueFd raw = authenticated();
  ASSERT_TRUE(sendWithDescriptors(raw.get(), lendingCall(1, "echo_withReply", 2), 1));
  EXPECT_THAT(receive(raw.get(), 100), HasSubstr("Error.InvalidArgs"));
  EXPECT_EQ(service->handled, 0);
}

TEST_F(LendingTest, MoreDescriptorsThanAnyCallTakesEndTheConnectionAndAreClosed) {
  const std::size_t before = openDescriptorCount();
  for (int i = 0; i < 10; ++i) EXPECT_TRUE(endsAfterDescriptors(1));
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= before; }));
  expectOneFaultPer(10);
}

TEST_F(LendingTest, DescriptorsThatNoCallTakesAreCountedUntilTheyEndTheConnection) {
  const std::size_t before = openDescriptorCount();
  const UniqueFd raw = authenticated();
  std::size_t answered = 0;
  for (std::uint32_t i = 1; sendWithDescriptors(raw.get(), methodCall(i, kPing, "Ping", "", "", 1), 1); ++i) {
    if (receive(raw.get(), kPong).size() < kPong) break;
    ++answered;
  }
  EXPECT_EQ(answered, DescriptorSieve::kMostStray);
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() <= before + 1; })) << "this end of the connection";
}

using DroppedMessageDeathTest = LendingTest;

// In a process of its own: what sd-bus loses of a message that it drops is lost for good.
TEST_F(DroppedMessageDeathTest, MessagesWithUndeclaredDescriptorsLoseFewBeforeTheyEndTheConnection) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto losesFew = [&] {
    const std::size_t before = openDescriptorCount();
    const UniqueFd raw = authenticated();
    const std::string undeclared = methodCall(1, kPing, "Ping");
    for (int i = 0; i < 1000 && sendWithDescriptors(raw.get(), undeclared, 1); ++i) {
    }
    return hangsUp(raw.get()) &&
           waitUntil([&] { return openDescriptorCount() <= before + 1 + DescriptorSieve::kMostStray; });
  };
  EXPECT_EXIT(::_exit(losesFew() ? 0 : 1), testing::ExitedWithCode(0), "");
}

TEST_F(LendingTest, CallsThatWaitToBeAnsweredKeepNoDescriptors) {
  const std::size_t before = openDescriptorCount();
  const UniqueFd raw = authenticated();
  constexpr int calls = 200;
  for (std::uint32_t i = 1; i <= calls; ++i) {
    ASSERT_TRUE(sendWithDescriptors(raw.get(), lendingCall(i, "keep_withReply"), 1));
  }
  ASSERT_TRUE(waitUntil([&] { return service->handled == calls; }));
  EXPECT_TRUE(waitUntil([&] { return openDescriptorCount() < before + 20; }));
  const std::lock_guard lock(service->mutex);
  service->held.clear();
}

}  // namespace
}  // namespace brivo::zeph
