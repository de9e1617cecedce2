// SPDX-License-Identifier: MIT
// Peers that break the rules: each ends with its own error, and the others notice nothing.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/raw_dbus.h"
#include "support/wait.h"
#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

using test::authentication;
using test::connectRaw;
using test::hangsUp;
using test::methodCall;
using test::receive;
using test::sendAll;
using test::sendWithDescriptors;
using test::waitUntil;
using testing::HasSubstr;

class HostilePeerTest : public EchoTest {
 protected:
  HostilePeerTest() : witness(connectClient()) { EXPECT_TRUE(echo(witness, {}).ok()); }
  ~HostilePeerTest() override { EXPECT_TRUE(echo(witness, {}).ok()) << "the others notice nothing"; }

  /// Sends `bytes` on a fresh connection and says whether the service hangs up.
  bool endsAfter(const std::string& bytes) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), bytes);
    return hangsUp(raw.get());
  }

  /// What a raw peer is answered to `message`.
  std::string answerTo(const std::string& message) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication() + message);
    std::string bytes;
    while (bytes.find("org.freedesktop.DBus.Error") == std::string::npos) {
      const std::string more = receive(raw.get(), 1);
      if (more.empty()) break;
      bytes += more;
    }
    return bytes + receive(raw.get(), 24);
  }

  std::shared_ptr<Connection> witness;
};

TEST_F(EchoTest, AFirstCallThatArrivesWithTheEndOfTheAuthenticationIsServed) {
  for (int i = 0; i < 20; ++i) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication() + methodCall(1, "org.freedesktop.DBus.Peer", "Ping"));
    const std::string answer = receive(raw.get(), std::string("OK \r\n").size() + 32 + 16 + 16);
    EXPECT_THAT(answer, HasSubstr("AGREE_UNIX_FD"));
    EXPECT_GT(answer.size(), 60u) << "the reply to the call";
  }
}

TEST_F(EchoTest, ManyCallsInOneWriteAreAllServed) {
  const UniqueFd raw = connectRaw(socketPath());
  std::string calls = authentication();
  for (std::uint32_t i = 1; i <= 300; ++i) calls += methodCall(i, "org.freedesktop.DBus.Peer", "Ping");
  sendAll(raw.get(), calls);
  const std::string answers = receive(raw.get(), 300 * 40);
  EXPECT_GE(answers.size(), 300u * 40);
}

TEST_F(HostilePeerTest, GarbageInsteadOfAuthenticationEndsTheConnection) {
  EXPECT_TRUE(endsAfter("GET / HTTP/1.1\r\n\r\n"));
}

TEST_F(HostilePeerTest, AFalseUserAndNoUserAreRejected) {
  for (const char* line : {"AUTH EXTERNAL 39393939\r\n", "AUTH ANONYMOUS\r\n", "AUTH\r\n"}) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), std::string(1, '\0') + line);
    EXPECT_EQ(receive(raw.get(), 8), "REJECTED") << line;
  }
}

TEST_F(HostilePeerTest, GarbageAfterAuthenticationEndsTheConnectionWithOneLineThatNamesThePeer) {
  EXPECT_TRUE(endsAfter(authentication() + std::string(64, '\xEE')));
  ASSERT_TRUE(waitUntil([&] {
    const std::lock_guard lock(faultsMutex);
    return !faults.empty();
  }));
  const std::lock_guard lock(faultsMutex);
  ASSERT_EQ(faults.size(), 1u);
  EXPECT_THAT(faults[0], HasSubstr("process " + std::to_string(::getpid())));
  EXPECT_THAT(faults[0], HasSubstr("broke the protocol"));
}

TEST_F(HostilePeerTest, AMessageThatClaimsToBeLargerThanAnyMayBeEndsTheConnection) {
  std::string message = methodCall(1, kEchoInterface, "hold");
  message[4] = message[5] = message[6] = '\xFF';
  message[7] = '\x7F';  // a body of 2 GiB
  EXPECT_TRUE(endsAfter(authentication() + message));
}

TEST_F(HostilePeerTest, HalfAMessageAndAHangUpLeavesNothingBehind) {
  const std::size_t before = test::openDescriptorCount();
  const std::string message = methodCall(1, kEchoInterface, "hold");
  for (std::size_t size = 0; size < message.size(); size += 7) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication() + message.substr(0, size));
  }
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() <= before; }));
  EXPECT_EQ(service->handled, 1) << "only the witness";
}

TEST_F(HostilePeerTest, HalfAMessageDoesNotHoldUpOthers) {
  const UniqueFd raw = connectRaw(socketPath());
  sendAll(raw.get(), authentication() + methodCall(1, kEchoInterface, "hold").substr(0, 20));
  EXPECT_TRUE(echo(witness, {}).ok());
}

TEST_F(HostilePeerTest, AnUnknownMemberIsAnsweredAsSuch) {
  EXPECT_THAT(answerTo(methodCall(1, kEchoInterface, "nothing")), HasSubstr(kErrorUnknownMethod));
}

TEST_F(HostilePeerTest, AMissingSignatureIsInvalidArgs) {
  EXPECT_THAT(answerTo(methodCall(1, kEchoInterface, "echo_withReply")), HasSubstr(kErrorInvalidArgs));
}

TEST_F(HostilePeerTest, AWrongSignatureIsInvalidArgs) {
  const std::string body = test::marshalledString("text");
  EXPECT_THAT(answerTo(methodCall(1, kEchoInterface, "echo_withReply", "s", body)),
              HasSubstr(kErrorInvalidArgs));
}

TEST_F(HostilePeerTest, ABodyThatIsNotWhatItsSignatureSaysEndsTheConnectionOrTheCall) {
  // A dictionary array of 4 bytes that is none: whatever the answer, the service goes on.
  const std::string body("\x04\0\0\0\0\0\0\0\xFF\xFF\xFF\xFF", 12);
  const UniqueFd raw = connectRaw(socketPath());
  sendAll(raw.get(), authentication() + methodCall(1, kEchoInterface, "echo_withReply", "a{sv}", body));
  sendAll(raw.get(), methodCall(2, kEchoInterface, "nothing"));
  EXPECT_FALSE(receive(raw.get(), 1).empty());
  EXPECT_EQ(service->handled, 1) << "only the witness";
}

TEST_F(HostilePeerTest, AClientThatNeverReadsIsEndedAndNobodyElseWaits) {
  const UniqueFd raw = connectRaw(socketPath());
  sendAll(raw.get(), authentication());
  ASSERT_TRUE(waitUntil([&] { return service->connection(1) != nullptr; }));
  const auto hoarder = service->connection(1);
  const auto proxy = hoarder->remoteObjectProxyWithErrorHandler(nullptr);
  const auto note = std::make_shared<const Arguments>(Arguments{Dictionary{{"x", std::string(2000, 'x')}}});
  for (int i = 0; i < 60'000; ++i) proxy.send("event:", note);
  EXPECT_TRUE(waitUntil([&] { return service->invalidated == 1; }));
  EXPECT_TRUE(hangsUp(raw.get()));
  const std::lock_guard lock(faultsMutex);
  ASSERT_EQ(faults.size(), 1u) << "one line";
  EXPECT_THAT(faults[0], HasSubstr("unread"));
}

TEST_F(HostilePeerTest, AHundredThousandSmallMessagesUnreadEndTheClientToo) {
  const UniqueFd raw = connectRaw(socketPath());
  sendAll(raw.get(), authentication());
  ASSERT_TRUE(waitUntil([&] { return service->connection(1) != nullptr; }));
  const auto proxy = service->connection(1)->remoteObjectProxyWithErrorHandler(nullptr);
  const auto note = std::make_shared<const Arguments>(Arguments{std::uint32_t{1}});
  EXPECT_TRUE(waitUntil([&] {
    for (int i = 0; i < 10'000; ++i) proxy.send("number:", note);
    return service->invalidated == 1;
  }));
  EXPECT_TRUE(hangsUp(raw.get()));
}

TEST_F(HostilePeerTest, AClientKilledInTheMiddleOfACallIsForgotten) {
  const std::size_t before = test::openDescriptorCount();
  {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication() + methodCall(1, kEchoInterface, "hold"));
    ASSERT_TRUE(waitUntil([&] {
      const std::lock_guard lock(service->mutex);
      return service->held.size() == 1;
    }));
  }
  ASSERT_TRUE(waitUntil([&] { return service->interrupted == 1; }));
  service->held.front()({Dictionary{}});  // nobody is there to hear it
  service->held.clear();
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() <= before; }));
}

TEST_F(HostilePeerTest, TenThousandQuickConnectionsLeaveNoDescriptor) {
  const std::size_t before = test::openDescriptorCount();
  for (int i = 0; i < 10'000; ++i) (void)connectRaw(socketPath());
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() <= before; }));
}

TEST_F(HostilePeerTest, DescriptorsWithoutAMessageThatMentionsThemAreNotKept) {
  const std::size_t before = test::openDescriptorCount();
  const std::string ping = methodCall(1, "org.freedesktop.DBus.Peer", "Ping");
  for (int i = 0; i < 20; ++i) {
    const UniqueFd raw = connectRaw(socketPath());
    sendAll(raw.get(), authentication());
    ASSERT_THAT(receive(raw.get(), 52), HasSubstr("AGREE_UNIX_FD"));
    if (sendWithDescriptors(raw.get(), ping, 1)) GTEST_SKIP() << "this kernel cannot refuse descriptors";
    sendAll(raw.get(), ping);
    EXPECT_EQ(receive(raw.get(), 40).size(), 40u) << "the connection goes on";
  }
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() <= before; }));
}

TEST_F(HostilePeerTest, AHangUpWithAnswersPendingIsNoFault) {
  for (int i = 0; i < 50; ++i) {
    const UniqueFd raw = connectRaw(socketPath());
    std::string calls = authentication();
    for (std::uint32_t serial = 1; serial <= 20; ++serial) {
      calls += methodCall(serial, "org.freedesktop.DBus.Peer", "Ping");
    }
    sendAll(raw.get(), calls);
  }
  EXPECT_TRUE(echo(witness, {}).ok());
  const std::lock_guard lock(faultsMutex);
  EXPECT_TRUE(faults.empty()) << faults.front();
}

}  // namespace
}  // namespace brivo::zeph
