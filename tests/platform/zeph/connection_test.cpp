// SPDX-License-Identifier: MIT
// Connections between honest peers.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <limits>
#include <thread>

#include "platform/base/memory_file.h"
#include "platform/zeph/send_burst.h"
#include "support/raw_dbus.h"
#include "support/wait.h"
#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

using test::waitUntil;
using namespace std::chrono_literals;

TEST_F(EchoTest, EveryKindOfValueGoesThereAndBack) {
  const Dictionary sent{{"flag", true},
                        {"i", std::int32_t{-21450}},
                        {"x", std::numeric_limits<std::int64_t>::min()},
                        {"u", std::uint32_t{4'000'000'000}},
                        {"t", std::numeric_limits<std::uint64_t>::max()},
                        {"d", 0.1},
                        {"text", "\xC3\xA4 \xF0\x9F\x93\xB7"},
                        {"bytes", Data::copyOf("abc")},
                        {"strings", Array{"a", "b"}},
                        {"datas", Array{Data::copyOf("x"), Data::copyOf("")}},
                        {"mixed", Array{"a", 1, Dictionary{{"k", false}}}},
                        {"nested", Dictionary{{"in", Dictionary{{"deeper", 1}}}}}};
  const auto client = connectClient();
  const Answer answer = echo(client, sent);
  ASSERT_TRUE(answer.ok()) << answer.error().text;
  EXPECT_EQ(*answer->front().get<Dictionary>(), sent);
}

TEST_F(EchoTest, UrlsEndpointsIndexSetsAndErrorsHaveTheirForms) {
  const auto client = connectClient();
  const Answer answer = echo(client, {{"url", Url("file:///a")},
                                      {"endpoint", Endpoint{"unix:path=/x"}},
                                      {"indexes", IndexSet{{3, 5}}},
                                      {"error", Error{"org.example", -4, "bad"}}});
  ASSERT_TRUE(answer.ok());
  const Dictionary& got = *answer->front().get<Dictionary>();
  EXPECT_EQ(*got.string("url"), "file:///a");
  EXPECT_EQ(*got.string("endpoint"), "unix:path=/x");
  EXPECT_EQ(*got.array("indexes"), (Array{std::uint64_t{3}, std::uint64_t{5}}));
  EXPECT_EQ(got.dictionary("error")->signedInteger("code"), -4);
}

TEST_F(EchoTest, DataFrom64KiBOnTravelsAsASealedMemoryFile) {
  const auto client = connectClient();
  for (const std::size_t size : {std::size_t{65535}, std::size_t{65536}, std::size_t{4} << 20}) {
    std::vector<std::byte> bytes(size, std::byte{0x5A});
    const Answer answer = echo(client, {{"data", Data(std::move(bytes))}});
    ASSERT_TRUE(answer.ok()) << answer.error().text;
    const Data& got = *answer->front().get<Dictionary>()->data("data");
    EXPECT_EQ(got.size(), size);
    EXPECT_EQ(got.bytes().back(), std::byte{0x5A});
    EXPECT_EQ(got.memfd() >= 0, size >= 65536) << size;
  }
}

TEST_F(EchoTest, DataThatIsAMemoryFileAlreadyIsNotCopied) {
  auto file = MemoryFile::create("test", 1 << 20);
  file->bytes()[0] = std::byte{1};
  service->data = *std::move(*file).seal(100'000);
  const auto client = connectClient();
  const Answer answer = call(client, "fetch", {});
  ASSERT_TRUE(answer.ok());
  const Data& got = *answer->front().get<Dictionary>()->data("data");
  EXPECT_EQ(got, service->data);
  struct stat sent {};
  struct stat received {};
  ASSERT_EQ(::fstat(service->data.memfd(), &sent), 0);
  ASSERT_EQ(::fstat(got.memfd(), &received), 0);
  EXPECT_EQ(sent.st_ino, received.st_ino) << "the very same memory";
}

TEST_F(EchoTest, ALargeMemberMakesAnArrayOfDataAnArrayOfVariants) {
  const auto client = connectClient();
  const Array sent{Data::copyOf("small"), Data(std::vector<std::byte>(70'000, std::byte{7}))};
  const Answer answer = echo(client, {{"datas", sent}});
  ASSERT_TRUE(answer.ok());
  EXPECT_EQ(*answer->front().get<Dictionary>()->array("datas"), sent);
}

TEST_F(EchoTest, AnEmptyArrayKeepsItsKind) {
  const auto client = connectClient();
  const Answer answer =
      echo(client,
           {{"strings", Array(Array::Kind::strings)}, {"datas", Array(Array::Kind::data)}, {"any", Array()}});
  ASSERT_TRUE(answer.ok());
  // An empty array has the wire form of its kind only where nothing in it says otherwise.
  EXPECT_TRUE(answer->front().get<Dictionary>()->array("datas")->empty());
}

TEST_F(EchoTest, TextThatIsNoUtf8IsMendedAndNotRefused) {
  const auto client = connectClient();
  const Answer answer = echo(client, {{"text", std::string("a\xFF\0b", 4)}});
  ASSERT_TRUE(answer.ok());
  EXPECT_EQ(*answer->front().get<Dictionary>()->string("text"),
            "a\xEF\xBF\xBD"
            "b");
}

TEST_F(EchoTest, NoncharactersAreMendedAndNotRefused) {
  const auto client = connectClient();
  const Answer answer = echo(client, {{"text", "a\uFFFEb\uFDD0c\U0010FFFFd\uFFFC"}});
  ASSERT_TRUE(answer.ok());
  EXPECT_EQ(*answer->front().get<Dictionary>()->string("text"), "a\uFFFDb\uFFFDc\uFFFDd\uFFFC");
}

/// A process that is being started has copies of all descriptors until it executes its program.
TEST_F(EchoTest, APeerMayHangUpWhileAProcessIsStarted) {
  for (int i = 0; i < 20; ++i) {
    const UniqueFd peer = test::connectRaw(socketPath());
    test::sendAll(peer.get(), test::authentication());
    ASSERT_FALSE(test::receive(peer.get(), 1).empty());
    const pid_t child = ::fork();
    if (child == 0) {
      ::prctl(PR_SET_PDEATHSIG, SIGKILL);
      ::pause();
      ::_exit(0);
    }
    ::shutdown(peer.get(), SHUT_RDWR);
    EXPECT_TRUE(echo(connectClient(), {}).ok());
    ::kill(child, SIGKILL);
    ::waitpid(child, nullptr, 0);
  }
}

TEST_F(EchoTest, ACallThatIsOnlyDeclaredIsAnsweredAsUnknown) {
  const auto client = connectClient();
  const Answer answer = call(client, "only:declared:withReply:", {});
  ASSERT_FALSE(answer.ok());
  EXPECT_EQ(answer.error().name, kErrorUnknownMethod);
  EXPECT_TRUE(echo(client, {}).ok()) << "the connection goes on";
}

TEST_F(EchoTest, ADroppedReplyIsAnError) {
  const auto client = connectClient();
  const Answer answer = call(client, "drop", {});
  ASSERT_FALSE(answer.ok());
  EXPECT_EQ(answer.error().name, kErrorNoReply);
}

TEST_F(EchoTest, TheFirstAnswerCounts) {
  const auto client = connectClient();
  auto answer = std::async(std::launch::async, [&] { return call(client, "hold", {}); });
  ASSERT_TRUE(waitUntil([&] {
    const std::lock_guard lock(service->mutex);
    return !service->held.empty();
  }));
  service->held.front()({Dictionary{{"n", 1}}});
  service->held.front()({Dictionary{{"n", 2}}});
  EXPECT_EQ(answer.get()->front().get<Dictionary>()->signedInteger("n"), 1);
}

TEST_F(EchoTest, ACallWithoutAnAnswerTimesOut) {
  const auto client = connectClient();
  const Answer answer = call(client, "hold", {}, 50ms);
  ASSERT_FALSE(answer.ok());
  EXPECT_EQ(answer.error().name, kErrorNoReply);
}

TEST_F(EchoTest, EveryKindOfValueArrivesInASignalAndLargeOnesKeepTheirPlace) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  ASSERT_TRUE(echo(client, {}).ok());
  const Dictionary small{{"flag", true},
                         {"i", std::int32_t{-21450}},
                         {"x", std::numeric_limits<std::int64_t>::min()},
                         {"t", std::numeric_limits<std::uint64_t>::max()},
                         {"d", 0.1},
                         {"text", "\xC3\xA4"},
                         {"bytes", Data::copyOf("abc")},
                         {"strings", Array{"a", "b"}},
                         {"datas", Array{Data::copyOf("x"), Data::copyOf("")}},
                         {"none", Array(Array::Kind::data)},
                         {"mixed", Array{"a", 1, Dictionary{{"k", false}}}},
                         {"nested", Dictionary{{"in", Dictionary{{"deeper", 1}}}}}};
  const Dictionary large{{"bytes", Data(std::vector<std::byte>(200'000, std::byte{7}))}};
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  constexpr std::size_t kCount = 300;
  const auto sent = [&](std::size_t i) { return i % 10 == 9 ? large : small; };
  for (std::size_t i = 0; i < kCount; ++i)
    proxy.send("event:", std::make_shared<const Arguments>(Arguments{sent(i)}));
  ASSERT_TRUE(waitUntil([&] { return collector->count() == kCount; }));
  for (std::size_t i = 0; i < kCount; ++i)
    EXPECT_EQ(*collector->received[i].second.get<Dictionary>(), sent(i)) << i;
}

TEST_F(EchoTest, SignalsArriveInOrderFromOneThread) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  ASSERT_TRUE(echo(client, {}).ok());
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  for (std::uint32_t i = 0; i < 5000; ++i) {
    proxy.send("number:", std::make_shared<const Arguments>(Arguments{i}));
  }
  ASSERT_TRUE(waitUntil([&] { return collector->count() == 5000; }));
  for (std::uint32_t i = 0; i < 5000; ++i) EXPECT_EQ(collector->received[i].second.asUnsigned(), i);
}

TEST_F(EchoTest, SignalsOfABurstArriveWhenItGoesAndThoseOfOthersMeanwhile) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  ASSERT_TRUE(echo(client, {}).ok());
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  const auto send = [&](std::uint32_t i) {
    proxy.send("number:", std::make_shared<const Arguments>(Arguments{i}));
  };
  constexpr std::uint32_t kCount = 1000;
  {
    const SendBurst burst;
    for (std::uint32_t i = 0; i < kCount; ++i) send(i);
    std::thread([&] { send(kCount); }).join();
    EXPECT_TRUE(waitUntil([&] { return collector->count() == kCount + 1; }))
        << "another thread wakes the loop";
    send(kCount + 1);
    send(kCount + 2);
  }
  ASSERT_TRUE(waitUntil([&] { return collector->count() == kCount + 3; }));
  for (std::uint32_t i = 0; i < kCount + 3; ++i) EXPECT_EQ(collector->received[i].second.asUnsigned(), i);
}

TEST_F(EchoTest, TwoPostingThreadsKeepTheirOwnOrder) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  ASSERT_TRUE(echo(client, {}).ok());
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  const auto post = [&](std::uint32_t base) {
    for (std::uint32_t i = 0; i < 2000; ++i) {
      proxy.send("number:", std::make_shared<const Arguments>(Arguments{base + i}));
    }
  };
  std::thread first(post, 0);
  std::thread second(post, 100'000);
  first.join();
  second.join();
  ASSERT_TRUE(waitUntil([&] { return collector->count() == 4000; }));
  std::uint64_t lastLow = 0;
  std::uint64_t lastHigh = 100'000;
  for (const auto& [selector, value] : collector->received) {
    std::uint64_t& last = *value.asUnsigned() < 100'000 ? lastLow : lastHigh;
    EXPECT_GE(*value.asUnsigned(), last);
    last = *value.asUnsigned();
  }
}

TEST_F(EchoTest, SignalsSentBeforeAReplyArriveBeforeIt) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  auto answer = std::async(std::launch::async, [&] { return call(client, "hold", {}); });
  ASSERT_TRUE(waitUntil([&] {
    const std::lock_guard lock(service->mutex);
    return !service->held.empty();
  }));
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  for (std::uint32_t i = 0; i < 100; ++i) {
    proxy.send("number:", std::make_shared<const Arguments>(Arguments{i}));
  }
  service->held.front()({Dictionary{}});
  ASSERT_TRUE(answer.get().ok());
  EXPECT_EQ(collector->count(), 100u);
}

TEST_F(EchoTest, ARefusedConnectionIsClosedBeforeItsFirstMessageIsServed) {
  service->refuse = true;
  const auto client = connectClient();
  const Answer answer = echo(client, {});
  EXPECT_FALSE(answer.ok());
  EXPECT_EQ(service->handled, 0);
  EXPECT_EQ(service->asked, 1);
}

TEST_F(EchoTest, APeerThatGoesAwayInterruptsTheConnectionOnce) {
  auto client = connectClient();
  ASSERT_TRUE(echo(client, {}).ok());
  client->invalidate();
  ASSERT_TRUE(waitUntil([&] { return service->interrupted == 1; }));
  EXPECT_EQ(service->invalidated, 0);
}

TEST_F(EchoTest, InvalidatingEndsThePeerAndRunsTheOneHandler) {
  const auto client = connectClient();
  std::binary_semaphore gone(0);
  ASSERT_TRUE(echo(client, {}).ok());
  client->setInterruptionHandler([&] { gone.release(); });
  const auto connection = service->connection();
  connection->invalidate();
  connection->invalidate();
  EXPECT_TRUE(gone.try_acquire_for(20s));
  ASSERT_TRUE(waitUntil([&] { return service->invalidated == 1; }));
  EXPECT_EQ(service->interrupted, 0);
  EXPECT_FALSE(echo(client, {}).ok());
}

TEST_F(EchoTest, AClearedHandlerDoesNotRun) {
  const auto client = connectClient();
  ASSERT_TRUE(echo(client, {}).ok());
  const auto connection = service->connection();
  connection->setInvalidationHandler(nullptr);
  connection->setInterruptionHandler(nullptr);
  connection->invalidate();
  EXPECT_TRUE(waitUntil([&] { return !echo(client, {}).ok(); }));
  EXPECT_EQ(service->invalidated + service->interrupted, 0);
}

TEST_F(EchoTest, WhatWasSentBeforeInvalidatingStillGoesOut) {
  const auto collector = std::make_shared<SignalCollector>();
  const auto client = connectClient(collector);
  ASSERT_TRUE(echo(client, {}).ok());
  const auto proxy = service->connection()->remoteObjectProxyWithErrorHandler(nullptr);
  for (std::uint32_t i = 0; i < 20; ++i) {
    proxy.send("number:", std::make_shared<const Arguments>(Arguments{i}));
  }
  service->connection()->invalidate();
  EXPECT_TRUE(waitUntil([&] { return collector->count() == 20; }));
}

TEST_F(EchoTest, SendingToAConnectionThatEndedTellsTheErrorHandler) {
  const auto client = connectClient();
  ASSERT_TRUE(echo(client, {}).ok());
  const auto connection = service->connection();
  connection->invalidate();
  EXPECT_FALSE(echo(client, {}).ok());
  int errors = 0;
  connection->remoteObjectProxyWithErrorHandler([&](const CallError&) { ++errors; })
      .send("event:", std::make_shared<const Arguments>(Arguments{Dictionary{}}));
  EXPECT_EQ(errors, 1);
}

TEST_F(EchoTest, CallsInWorkAreBoundedAndAllAnswered) {
  const auto client = connectClient();
  const auto proxy = client->remoteObjectProxyWithErrorHandler(nullptr);
  std::atomic<int> answered = 0;
  constexpr int kCalls = 2000;
  for (int i = 0; i < kCalls; ++i) {
    proxy.call("hold", {}, 60s, [&](const Answer& answer) { answered += answer.ok() ? 1 : 0; });
  }
  const auto heldCount = [&] {
    const std::lock_guard lock(service->mutex);
    return service->held.size();
  };
  ASSERT_TRUE(waitUntil([&] { return heldCount() >= BusConnection::kMostCallsInWork; }));
  EXPECT_LT(heldCount(), BusConnection::kMostCallsInWork + 128) << "the rest waits in the socket";
  while (answered < kCalls) {
    std::vector<Reply> batch;
    {
      const std::lock_guard lock(service->mutex);
      batch.swap(service->held);
    }
    for (const Reply& reply : batch) reply({Dictionary{}});
    std::this_thread::yield();
  }
}

TEST_F(EchoTest, ABackloggedPeerIsReportedAndItsEndReleasesWhoWaits) {
  const auto connection = [&] {
    const UniqueFd raw = test::connectRaw(socketPath());
    test::sendAll(raw.get(), test::authentication());
    EXPECT_TRUE(waitUntil([&] { return service->connection() != nullptr; }));
    const auto peer = service->connection();
    const auto proxy = peer->remoteObjectProxyWithErrorHandler(nullptr);
    EXPECT_FALSE(peer->isBacklogged());
    const auto note = std::make_shared<const Arguments>(Arguments{Dictionary{{"x", std::string(4000, 'x')}}});
    EXPECT_TRUE(waitUntil([&] {
      for (int i = 0; i < 100; ++i) proxy.send("event:", note);
      return peer->isBacklogged();
    }));
    // It never reads: after a while nobody waits for it any more.
    std::binary_semaphore released(0);
    peer->whenNotBacklogged([&] { released.release(); });
    EXPECT_TRUE(released.try_acquire_for(20s));
    EXPECT_FALSE(peer->isBacklogged());
    return peer;
  }();
  EXPECT_TRUE(waitUntil([&] { return service->interrupted == 1; }));
  std::binary_semaphore released(0);
  connection->whenNotBacklogged([&] { released.release(); });
  EXPECT_TRUE(released.try_acquire_for(20s)) << "an ended connection is no backlog";
}

TEST_F(EchoTest, WhetherNobodyIsConnectedIsAnsweredAndAcceptingGoesOnOtherwise) {
  const auto idle = [&] {
    std::promise<bool> answer;
    connections->stopAcceptingIfIdle([&](bool value) { answer.set_value(value); });
    return answer.get_future().get();
  };
  {
    const auto client = connectClient();
    ASSERT_TRUE(echo(client, {}).ok());
    EXPECT_FALSE(idle());
    EXPECT_TRUE(echo(connectClient(), {}).ok());
    client->invalidate();
  }
}

TEST_F(EchoTest, TheSocketFileGoesWithTheListener) {
  auto anonymous = std::move(connections->anonymousListener(*folder)).value();
  anonymous->resume();
  const std::string path = anonymous->endpoint().address.substr(std::string("unix:path=").size());
  EXPECT_EQ(::access(path.c_str(), F_OK), 0);
  anonymous->invalidate();
  EXPECT_NE(::access(path.c_str(), F_OK), 0);
}

/// Takes its time with the decision.
class SlowDelegate : public ListenerDelegate {
 public:
  bool shouldAcceptNewConnection(Listener&, const std::shared_ptr<Connection>& connection) override {
    asked.set_value();
    mayDecide.get_future().wait();
    connection->resume();
    return true;
  }

  std::promise<void> asked, mayDecide;
};

TEST_F(EchoTest, ADecisionThatComesAfterTheEndOfTheServiceDoesNoHarm) {
  const auto delegate = std::make_shared<SlowDelegate>();
  listener->setDelegate(delegate);
  const auto client = connectClient();
  delegate->asked.get_future().wait();
  connections.reset();
  delegate->mayDecide.set_value();
  pool.waitUntilIdle();
  client->invalidate();
}

}  // namespace
}  // namespace brivo::zeph
