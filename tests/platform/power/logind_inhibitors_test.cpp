// SPDX-License-Identifier: MIT
// With a stand-in for logind on a real message bus.
#include "platform/power/logind_inhibitors.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include <atomic>
#include <mutex>
#include <thread>

#include "platform/base/unique_fd.h"
#include "support/environment.h"
#include "support/message_bus.h"
#include "support/wait.h"

namespace brivo {
namespace {

using namespace std::chrono_literals;
using test::MessageBus;
using test::waitUntil;

/// Answers Inhibit with the write end of a pipe, and counts the locks that are held.
class StandInLogind {
 public:
  StandInLogind() : thread_([this] { run(); }) {
    EXPECT_TRUE(waitUntil([&] { return ready_.load(); }));
  }
  ~StandInLogind() {
    ending_ = true;
    thread_.join();
  }
  StandInLogind(const StandInLogind&) = delete;
  StandInLogind& operator=(const StandInLogind&) = delete;

  int asked() const { return asked_; }
  /// Locks whose descriptor is still open somewhere.
  int held() {
    const std::lock_guard lock(mutex_);
    int count = 0;
    for (const UniqueFd& readEnd : pipes_) {
      char byte = 0;
      if (::read(readEnd.get(), &byte, 1) < 0 && errno == EAGAIN) ++count;
    }
    return count;
  }
  std::vector<std::string> lastArguments() {
    const std::lock_guard lock(mutex_);
    return arguments_;
  }

 private:
  void run() {
    sd_bus* bus = nullptr;
    sd_bus_open_system(&bus);
    const sd_bus_vtable table[] = {
        SD_BUS_VTABLE_START(0), SD_BUS_METHOD("Inhibit", "ssss", "h", onInhibit, SD_BUS_VTABLE_UNPRIVILEGED),
        SD_BUS_VTABLE_END};
    sd_bus_add_object_vtable(bus, nullptr, "/org/freedesktop/login1", "org.freedesktop.login1.Manager", table,
                             this);
    ready_ = sd_bus_request_name(bus, "org.freedesktop.login1", 0) >= 0;
    while (!ending_) {
      while (sd_bus_process(bus, nullptr) > 0) {
      }
      sd_bus_wait(bus, 10'000);
    }
    sd_bus_flush_close_unref(bus);
  }

  static int onInhibit(sd_bus_message* call, void* userdata, sd_bus_error*) {
    auto* self = static_cast<StandInLogind*>(userdata);
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0) return -errno;
    const UniqueFd writeEnd(ends[1]);
    {
      const std::lock_guard lock(self->mutex_);
      self->pipes_.emplace_back(ends[0]);
      self->arguments_.clear();
      const char* text = nullptr;
      while (sd_bus_message_read(call, "s", &text) > 0) self->arguments_.emplace_back(text);
    }
    ++self->asked_;
    return sd_bus_reply_method_return(call, "h", writeEnd.get());
  }

  std::atomic<bool> ready_ = false;
  std::atomic<bool> ending_ = false;
  std::atomic<int> asked_ = 0;
  std::mutex mutex_;
  std::vector<UniqueFd> pipes_;
  std::vector<std::string> arguments_;
  std::thread thread_;
};

class LogindInhibitorsTest : public testing::Test {
 protected:
  ~LogindInhibitorsTest() override {
    loop.quit();
    thread.join();
  }

  std::string faults() {
    const std::lock_guard lock(mutex);
    return faults_;
  }

  MessageBus bus;
  test::ScopedVariable address{"DBUS_SYSTEM_BUS_ADDRESS", bus.address()};
  RunLoop loop;
  std::mutex mutex;
  std::string faults_;
  LogindInhibitors inhibitors{loop,
                              [this](const std::string& line) {
                                const std::lock_guard lock(mutex);
                                faults_ += line + "\n";
                              },
                              100ms};
  std::thread thread{[this] { loop.run(); }};
};

TEST_F(LogindInhibitorsTest, AnAssertionIsABlockingInhibitorForSleepAndIdle) {
  StandInLogind logind;
  auto handle = inhibitors.create("org.orvid.brivod-zeph+CARD", 120s);
  ASSERT_TRUE(waitUntil([&] { return logind.held() == 1; }));
  EXPECT_THAT(logind.lastArguments(),
              testing::ElementsAre("sleep:idle", "brivod", "org.orvid.brivod-zeph+CARD", "block"));
  handle.reset();
  EXPECT_TRUE(waitUntil([&] { return logind.held() == 0; }));
}

TEST_F(LogindInhibitorsTest, ARunOfShortAssertionsCostsOneCall) {
  StandInLogind logind;
  for (int i = 0; i < 1000; ++i) inhibitors.create("name", 120s).reset();
  ASSERT_TRUE(waitUntil([&] { return logind.held() == 1; }));
  for (int i = 0; i < 1000; ++i) inhibitors.create("name", 120s).reset();
  EXPECT_TRUE(waitUntil([&] { return logind.held() == 0; }));
  EXPECT_EQ(logind.asked(), 1);
}

TEST_F(LogindInhibitorsTest, AnAssertionEndsByItselfAfterItsTimeout) {
  StandInLogind logind;
  const auto handle = inhibitors.create("name", 1s);
  ASSERT_TRUE(waitUntil([&] { return logind.held() == 1; }));
  EXPECT_TRUE(waitUntil([&] { return logind.held() == 0; }));
}

TEST_F(LogindInhibitorsTest, TwoNamesAreTwoInhibitors) {
  StandInLogind logind;
  const auto first = inhibitors.create("a", 120s);
  const auto second = inhibitors.create("b", 120s);
  EXPECT_TRUE(waitUntil([&] { return logind.held() == 2; }));
}

TEST_F(LogindInhibitorsTest, WithoutLogindItSaysSoOnceAndGoesOn) {
  for (int i = 0; i < 10; ++i) (void)inhibitors.create("name", 120s);
  ASSERT_TRUE(waitUntil([&] { return !faults().empty(); }));
  const auto handle = inhibitors.create("name", 120s);
  EXPECT_TRUE(handle);
  EXPECT_EQ(std::ranges::count(faults(), '\n'), 1);
}

}  // namespace
}  // namespace brivo
