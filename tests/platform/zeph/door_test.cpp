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
#include "support/wait.h"
#include "zeph/echo_service.h"

namespace brivo::zeph {
namespace {

using test::waitUntil;

constexpr const char* kName = "org.example.Door";
constexpr Member kDoorMembers[] = {{"Open", Member::Kind::method, "", "h", "socket,"}};
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

  DoorPlan plan() const { return {kName, kDoorProtocol, keeper, nullptr}; }

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
  RunLoop loop;
  const auto door = std::make_shared<BusDoor>(loop, plan());
  keeper->holds = true;
  std::thread thread([&] { loop.run(); });
  loop.post([&] { door->open(); });
  EXPECT_TRUE(waitUntil([&] { return caller.nameHasOwner(); }));
  std::promise<std::size_t> inWork;
  loop.post([&] {
    caller.knock();  // the loop cannot read it meanwhile
    door->giveNameUp([&](bool given) { inWork.set_value(given ? door->visitsInWork() : 99); });
  });
  EXPECT_EQ(inWork.get_future().get(), 1u);
  EXPECT_FALSE(caller.nameHasOwner());
  loop.post([&] { door->takeNameAgain(); });
  EXPECT_TRUE(waitUntil([&] { return caller.nameHasOwner(); }));
  EXPECT_TRUE(waitUntil([&] { return keeper->visits == 1; }));
  keeper->letGo();
  EXPECT_EQ(caller.answer(), kErrorNoReply) << "the service has read it, and its keeper has answered";
  loop.post([&] { door->end(); });
  loop.quit();
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
