// SPDX-License-Identifier: MIT
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <memory>
#include <optional>
#include <thread>

#include "alerts/notification_server.h"
#include "platform/alerts/desktop_notifications.h"
#include "support/environment.h"
#include "support/message_bus.h"
#include "support/wait.h"

namespace brivo::test {

/// Alerts on a session bus of their own.
class AlertsTest : public testing::Test {
 protected:
  using Habit = NotificationServer::Habit;
  using Waiting = std::future<UserAlert::Response>;

  ~AlertsTest() override { endLoop(); }

  void endLoop() {
    loop.quit();
    if (thread.joinable()) thread.join();
  }
  /// Runs `task` on the loop of the alerts and waits for it.
  void onLoop(const std::function<void()>& task) {
    std::promise<void> done;
    loop.post([&] {
      task();
      done.set_value();
    });
    done.get_future().wait();
  }
  /// Somebody waits for the answer, in a thread.
  static Waiting waitFor(UserAlert& alert) {
    return std::async(std::launch::async, [&alert] { return alert.waitForResponse(); });
  }
  static bool isAnswered(const Waiting& waiting) {
    return waiting.wait_for(std::chrono::seconds(0)) == std::future_status::ready;
  }
  /// What was sent to the alerts before this has been looked at after it.
  void settle(NotificationServer& server) {
    const auto before = server.shown().size();
    const auto another = alerts->show({{"title", "another"}});
    ASSERT_TRUE(another);
    EXPECT_EQ(server.shown().size(), before + 1);
  }

  MessageBus bus;
  ScopedVariable address{"DBUS_SESSION_BUS_ADDRESS", bus.address()};
  RunLoop loop;
  std::thread thread{[this] { loop.run(); }};
  std::unique_ptr<DesktopNotifications> alerts = std::make_unique<DesktopNotifications>(loop);
  const Dictionary question{{"title", "May it?"},
                            {"message", "It wants to."},
                            {"defaultButton", "Allow"},
                            {"alternateButton", "Do Not Allow"},
                            {"otherButton", "Later"}};
};

}  // namespace brivo::test
