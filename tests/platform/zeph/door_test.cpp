// SPDX-License-Identifier: MIT
// The door on a message bus of the test's own.
#include "platform/zeph/door.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <systemd/sd-bus.h>

#include <future>
#include <thread>

#include "platform/zeph/bus_door.h"
#include "support/environment.h"
#include "support/message_bus.h"
#include "support/raw_dbus.h"
#include "support/wait.h"
#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

using test::waitUntil;

constexpr const char* kName = "org.example.Door";
constexpr Member kDoorMembers[] = {{"Open", Member::Kind::method, "", "h", "socket,"},
                                   {"OpenNamed:", Member::Kind::method, "s", "h", "name,socket,"}};
constexpr std::size_t kLongestName = 36;
constexpr const char* kErrorTooLong = "org.example.Door1.Error.UnknownName";
constexpr Protocol kDoorProtocol{"org.example.Door1", kDoorMembers};
constexpr const char* kBus = "org.freedesktop.DBus";

/// A blocking client of the bus.
class Caller {
 public:
  Caller() { EXPECT_GE(sd_bus_open_user(&bus_), 0); }
  ~Caller() { sd_bus_flush_close_unref(bus_); }
  Caller(const Caller&) = delete;
  Caller& operator=(const Caller&) = delete;

  bool nameHasOwner() {
    int owned = 0;
    BusMessage answer;
    EXPECT_GE(sd_bus_call_method(bus_, kBus, "/org/freedesktop/DBus", kBus, "NameHasOwner", nullptr,
                                 answer.out(), "s", kName),
              0);
    EXPECT_GE(sd_bus_message_read(answer.get(), "b", &owned), 0);
    return owned != 0;
  }

  /// Calls and does not wait; the bus has the call when this returns.
  void knock() {
    EXPECT_GE(sd_bus_call_method_async(bus_, nullptr, kName, kObjectPath, kDoorProtocol.interface, "Open",
                                       onAnswer, this, ""),
              0);
    (void)nameHasOwner();
  }
  void knockFor(const std::string& name) {
    EXPECT_GE(sd_bus_call_method_async(bus_, nullptr, kName, kObjectPath, kDoorProtocol.interface,
                                       kDoorMembers[1].dbusName().c_str(), onAnswer, this, "s", name.c_str()),
              0);
    (void)nameHasOwner();
  }
  /// "socket" or the name of an error.
  std::string answer() {
    EXPECT_TRUE(waitUntil([&] {
      while (sd_bus_process(bus_, nullptr) > 0) {
      }
      return !answer_.empty();
    }));
    return std::exchange(answer_, "");
  }

 private:
  static int onAnswer(sd_bus_message* answer, void* userdata, sd_bus_error*) {
    auto* self = static_cast<Caller*>(userdata);
    const sd_bus_error* error = sd_bus_message_get_error(answer);
    int borrowed = -1;
    EXPECT_TRUE(error || sd_bus_message_read(answer, "h", &borrowed) >= 0);
    self->socket_.reset(::fcntl(borrowed, F_DUPFD_CLOEXEC, 0));
    self->answer_ = error ? error->name : "socket";
    return 0;
  }

  sd_bus* bus_ = nullptr;
  std::string answer_;
  UniqueFd socket_;  // the last one
};

/// A client that attaches descriptors to calls that have none in their signature.
class Smuggler {
 public:
  static constexpr std::size_t kMostAtOnce = 16;  // of one message, for dbus-daemon

  explicit Smuggler(const std::string& address) {
    const std::string prefix = "unix:path=";
    socket_ = test::connectRaw(address.substr(prefix.size(), address.find(',') - prefix.size()));
    test::sendAll(socket_.get(), test::authentication());
    // Not earlier: what comes in one read with the authentication loses its descriptors.
    EXPECT_FALSE(test::receive(socket_.get(), 52).empty());
    test::sendAll(socket_.get(), test::methodCall(++serial_, kBus, "Hello", "", "", 0, kBus));
  }
  void knock() {
    EXPECT_TRUE(test::sendWithDescriptors(
        socket_.get(),
        test::methodCall(++serial_, kDoorProtocol.interface, "Open", "", "", kMostAtOnce, kName),
        kMostAtOnce));
  }

 private:
  UniqueFd socket_;
  std::uint32_t serial_ = 0;
};

/// Sends everybody to one listener, at once or when it is told to.
class OneWayKeeper : public Doorkeeper {
 public:
  explicit OneWayKeeper(std::shared_ptr<Listener> listener) : listener_(std::move(listener)) {}

  void visited(Visit visit) override {
    const std::lock_guard lock(mutex_);
    ++visits;
    if (holds) {
      held_.push_back(std::move(visit));
    } else {
      visit.reply({listener_, {}});
    }
  }
  void letGo() {
    const std::lock_guard lock(mutex_);
    held_.clear();
  }

  std::atomic<bool> holds = false;
  std::atomic<int> visits = 0;

 private:
  const std::shared_ptr<Listener> listener_;
  std::mutex mutex_;
  std::vector<Visit> held_;
};

struct DoorTest : EchoTest {
  DoorTest() {
    connections->openDoor(plan());
    EXPECT_TRUE(waitUntil([&] { return caller.nameHasOwner(); }));
  }

  DoorPlan plan() const {
    return {kName, kDoorProtocol, kLongestName, {kErrorTooLong, "too long"}, keeper, nullptr};
  }

  bool closed() {
    std::promise<bool> closed;
    connections->closeDoorIfIdle([&](bool idle) { closed.set_value(idle); });
    return closed.get_future().get();
  }

  test::MessageBus daemon;
  test::ScopedVariable address{"DBUS_SESSION_BUS_ADDRESS", daemon.address()};
  std::shared_ptr<OneWayKeeper> keeper = std::make_shared<OneWayKeeper>(listener);
  Caller caller;
};

TEST_F(DoorTest, ACallerGetsASocketAndTheListenersDelegateItsConnection) {
  caller.knock();
  EXPECT_EQ(caller.answer(), "socket");
  ASSERT_TRUE(waitUntil([&] { return service->connection() != nullptr; }));
  EXPECT_EQ(service->connection()->processIdentifier(), ::getpid());
}

TEST_F(DoorTest, ACallThatNobodyAnswersIsAnErrorForItsCaller) {
  keeper->holds = true;
  caller.knock();
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  keeper->letGo();
  EXPECT_EQ(caller.answer(), kErrorNoReply);
}

TEST_F(DoorTest, ATextThatIsLongerThanAnyNameIsAnErrorAndNeverSeenByTheKeeper) {
  caller.knockFor(std::string(kLongestName + 1, 'x'));
  EXPECT_EQ(caller.answer(), kErrorTooLong);
  caller.knockFor(std::string(std::size_t{8} << 20, 'x'));
  EXPECT_EQ(caller.answer(), kErrorTooLong);
  EXPECT_EQ(keeper->visits, 0);
  caller.knockFor(std::string(kLongestName, 'x'));
  EXPECT_EQ(caller.answer(), "socket");
}

/// Sockets of connections and of the test itself; fewer than come with the calls.
constexpr std::size_t kFew = 60;

TEST_F(DoorTest, DescriptorsThatComeWithCallsAreClosedBeforeTheCallsAreAnswered) {
  const std::size_t before = test::openDescriptorCount();
  keeper->holds = true;
  Smuggler smuggler(daemon.address());
  constexpr int calls = BusVisits::kMostOfOneCaller;
  for (int i = 0; i < calls; ++i) smuggler.knock();
  ASSERT_TRUE(waitUntil([&] { return keeper->visits == calls; }));
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() < before + kFew; }));
  keeper->letGo();
}

TEST_F(DoorTest, DescriptorsThatCameWithCallsAreNotKeptInCaseTheirAnswersComeBack) {
  const std::size_t before = test::openDescriptorCount();
  Smuggler smuggler(daemon.address());
  for (int i = 1; i <= 8; ++i) {
    smuggler.knock();
    ASSERT_TRUE(waitUntil([&] { return keeper->visits == i; }));
  }
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() < before + kFew; }));
}

TEST_F(DoorTest, AnAnswerIsHeardByNobodyWhenTheConnectionServiceHasGone) {
  keeper->holds = true;
  caller.knock();
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  connections.reset();
  keeper->letGo();
}

TEST_F(DoorTest, AnswersOnOtherThreadsWhileTheBusGoesAwayAreForNobody) {
  keeper->holds = true;
  for (std::size_t i = 0; i < BusVisits::kMostOfOneCaller; ++i) caller.knock();
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == static_cast<int>(BusVisits::kMostOfOneCaller); }));
  std::thread other([&] { keeper->letGo(); });
  daemon.end();
  other.join();
  EXPECT_TRUE(closed()) << "the I/O thread goes on";
}

TEST_F(DoorTest, AListenerThatHasEndedIsAnErrorForItsCaller) {
  listener->invalidate();
  caller.knock();
  EXPECT_EQ(caller.answer(), kErrorFailed);
}

TEST_F(DoorTest, ACloseThatNobodyMindsGivesTheNameUp) {
  EXPECT_TRUE(closed());
  EXPECT_FALSE(caller.nameHasOwner());
}

TEST_F(DoorTest, ACallInWorkAndAConnectionKeepTheDoorOpen) {
  keeper->holds = true;
  caller.knock();
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  EXPECT_FALSE(closed());
  EXPECT_TRUE(caller.nameHasOwner());
  keeper->letGo();
  EXPECT_EQ(caller.answer(), kErrorNoReply);
  keeper->holds = false;
  const auto client = connectClient();
  ASSERT_TRUE(echo(client, {}).ok());
  EXPECT_FALSE(closed());
  caller.knock();
  EXPECT_EQ(caller.answer(), "socket");
}

TEST_F(DoorTest, CallsThatWereMadeBeforeTheNameIsGivenUpHaveBeenReadByThenAndAreAnswered) {
  ASSERT_TRUE(closed());
  const auto loop = std::make_shared<RunLoop>();
  const auto door = std::make_shared<BusDoor>(loop, plan());
  keeper->holds = true;
  std::thread thread([&] { loop->run(); });
  loop->post([&] { door->open(); });
  EXPECT_TRUE(waitUntil([&] { return caller.nameHasOwner(); }));
  std::promise<std::size_t> inWork;
  loop->post([&] {
    caller.knock();  // the loop cannot read it meanwhile
    door->giveNameUp([&](bool given) { inWork.set_value(given ? door->visitsInWork() : 99); });
  });
  EXPECT_EQ(inWork.get_future().get(), 1u);
  EXPECT_FALSE(caller.nameHasOwner());
  loop->post([&] { door->takeNameAgain(); });
  EXPECT_TRUE(waitUntil([&] { return caller.nameHasOwner(); }));
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  keeper->letGo();
  EXPECT_EQ(caller.answer(), kErrorNoReply) << "the service has read it, and its keeper has answered";
  loop->post([&] { door->end(); });
  loop->quit();
  thread.join();
}

TEST_F(DoorTest, ABusThatHasEndedKeepsNobodyFromLeaving) {
  daemon.end();
  EXPECT_TRUE(closed());
}

TEST_F(DoorTest, WhoHasConnectedToTheSocketOfTheServicesOwnKeepsItFromLeaving) {
  const auto client = connections->connect(listener->endpoint(), std::chrono::seconds(10));
  ASSERT_TRUE(client.ok());
  std::promise<bool> idle;
  connections->stopAcceptingIfIdle([&](bool isIdle) { idle.set_value(isIdle); });
  EXPECT_FALSE(idle.get_future().get());
  EXPECT_EQ(::access(socketPath().c_str(), F_OK), 0);
}

TEST_F(DoorTest, TheSocketOfTheServicesOwnIsOutOfSightBeforeItLeaves) {
  std::promise<bool> idle;
  connections->stopAcceptingIfIdle([&](bool isIdle) { idle.set_value(isIdle); });
  EXPECT_TRUE(idle.get_future().get());
  EXPECT_NE(::access(socketPath().c_str(), F_OK), 0);
  keeper->holds = true;
  caller.knock();
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  EXPECT_FALSE(closed());
  EXPECT_EQ(::access(socketPath().c_str(), F_OK), 0) << "and back when it stays";
  EXPECT_TRUE(echo(connectClient(), {}).ok());
  keeper->letGo();
}

}  // namespace
}  // namespace brivo::zeph
