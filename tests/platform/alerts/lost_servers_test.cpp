// SPDX-License-Identifier: MIT
// Notification servers that are not there, do not want to, or go away.
#include <unistd.h>

#include "alerts/alerts_test.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

using namespace std::chrono_literals;
using test::NotificationServer;
using test::Shown;
using test::waitUntil;

class NobodyToAskTest : public test::AlertsTest {};

TEST_F(NobodyToAskTest, WithoutASessionBus) {
  const test::TemporaryFolder empty;
  const test::ScopedVariable none("DBUS_SESSION_BUS_ADDRESS", "unix:path=" + (empty / "none"));
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithAnAddressThatIsNone) {
  const test::ScopedVariable none("DBUS_SESSION_BUS_ADDRESS", "nonsense");
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithoutTheVariables) {
  const test::ScopedVariable none("DBUS_SESSION_BUS_ADDRESS", std::nullopt);
  const test::ScopedVariable folder("XDG_RUNTIME_DIR", std::nullopt);
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithoutAServer) {
  EXPECT_FALSE(alerts->show(question));
  NotificationServer server;
  EXPECT_TRUE(alerts->show(question)) << "once there is one";
}

TEST_F(NobodyToAskTest, WithAServerThatHasNoButtons) {
  NotificationServer server({"body", "body-markup"});
  EXPECT_FALSE(alerts->show(question));
  EXPECT_TRUE(server.shown().empty());
}

TEST_F(NobodyToAskTest, WithAServerThatRefuses) {
  NotificationServer server({"actions"}, Habit::refuses);
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithAServerThatGivesNoNumber) {
  NotificationServer server({"actions"}, Habit::saysNumberZero);
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithAServerThatDoesNotAnswer) {
  onLoop([&] { alerts = std::make_unique<DesktopNotifications>(loop, 50ms); });
  NotificationServer server({"actions"}, Habit::isSilent);
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(NobodyToAskTest, WithAServerThatHangsUpInsteadOfAnswering) {
  auto server = std::make_unique<NotificationServer>(std::vector<std::string>{"actions"}, Habit::isSilent);
  auto showing = std::async(std::launch::async, [&] { return alerts->show(question) != nullptr; });
  server->waitForShown();
  server.reset();
  EXPECT_FALSE(showing.get());
}

/// A server that does not answer is replaced while it is asked.
class SlowServerTest : public test::AlertsTest {
 protected:
  void SetUp() override {
    showing = std::async(std::launch::async, [this] { return alerts->show(question); });
    slow->waitForShown();
  }

  std::unique_ptr<NotificationServer> slow =
      std::make_unique<NotificationServer>(std::vector<std::string>{"actions"}, Habit::isSilent);
  std::future<std::unique_ptr<UserAlert>> showing;
};

TEST_F(SlowServerTest, TheNextOneIsAskedWhenItAnswersTooLate) {
  NotificationServer next;
  slow->answerAll();
  const auto alert = showing.get();
  ASSERT_TRUE(alert);
  EXPECT_TRUE(waitUntil([&] { return slow->withdrawn().size() == 1; })) << "it is not shown twice";
  const Shown shown = next.waitForShown();
  next.press(shown, shown.keyOf("Allow"));
  EXPECT_EQ(alert->waitForResponse(), UserAlert::defaultButton);
}

TEST_F(SlowServerTest, TheNextOneIsAskedWhenItHangsUp) {
  NotificationServer next;
  slow.reset();
  const auto alert = showing.get();
  ASSERT_TRUE(alert);
  const Shown shown = next.waitForShown();
  next.press(shown, shown.keyOf("Allow"));
  EXPECT_EQ(alert->waitForResponse(), UserAlert::defaultButton);
}

TEST_F(SlowServerTest, WhatItShowsWhenNobodyAsksAnyMoreIsTakenFromItsScreen) {
  onLoop([&] { alerts->dismissAll(); });
  EXPECT_EQ(showing.get(), nullptr);
  slow->answerAll();
  EXPECT_TRUE(waitUntil([&] { return slow->withdrawn().size() == 1; }));
}

TEST_F(SlowServerTest, WhatItAnswersWhileAllEndsIsTakenFromItsScreen) {
  onLoop([&] { alerts->dismissAll(); });
  EXPECT_EQ(showing.get(), nullptr);
  endLoop();
  slow->answerAll();
  alerts.reset();
  EXPECT_TRUE(waitUntil([&] { return slow->withdrawn().size() == 1; }));
}

class LostServerTest : public test::AlertsTest {
 protected:
  void SetUp() override {
    first = std::make_unique<NotificationServer>();
    alert = alerts->show(question);
    ASSERT_TRUE(alert);
    waiting = waitFor(*alert);
    shownFirst = first->waitForShown();
  }

  std::unique_ptr<NotificationServer> first;
  Shown shownFirst;
  std::unique_ptr<UserAlert> alert;
  Waiting waiting;
};

TEST_F(LostServerTest, AnAlertIsShownAgainByTheNextServerAndAnsweredThere) {
  first.reset();
  NotificationServer second;
  const Shown again = second.waitForShown();
  EXPECT_EQ(again.title, shownFirst.title);
  EXPECT_EQ(again.actions, shownFirst.actions);
  EXPECT_FALSE(isAnswered(waiting));
  second.press(again, again.keyOf("Allow"));
  EXPECT_EQ(waiting.get(), UserAlert::defaultButton);
}

TEST_F(LostServerTest, AnAlertMovesToAServerThatTakesTheNameOver) {
  NotificationServer second;
  const Shown again = second.waitForShown();
  EXPECT_TRUE(waitUntil([&] { return first->withdrawn().size() == 1; })) << "it is not shown twice";
  first->press(shownFirst, shownFirst.keyOf("Allow"));
  second.press(again, again.keyOf("Later"));
  EXPECT_EQ(waiting.get(), UserAlert::otherButton);
}

TEST_F(LostServerTest, AnAlertIsDismissedByANextServerWithoutButtons) {
  NotificationServer second({"body"});
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
}

TEST_F(LostServerTest, AnAlertIsDismissedByANextServerThatRefuses) {
  NotificationServer second({"actions"}, Habit::refuses);
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
}

TEST_F(LostServerTest, AnAlertCanBeWithdrawnWhileThereIsNoServer) {
  first.reset();
  onLoop([&] { alerts->dismissAll(); });
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  alert.reset();
  NotificationServer second;
  settle(second);
  EXPECT_EQ(second.shown().size(), 1u) << "only the one of settle()";
}

TEST_F(LostServerTest, AnAlertThatWasAnsweredIsNotShownAgain) {
  first->press(shownFirst, shownFirst.keyOf("Allow"));
  EXPECT_EQ(waiting.get(), UserAlert::defaultButton);
  first.reset();
  NotificationServer second;
  settle(second);
  EXPECT_EQ(second.shown().size(), 1u) << "only the one of settle()";
}

TEST_F(LostServerTest, AServerThatGoesWheneverItIsAskedIsNotAskedForEver) {
  NotificationServer second({"actions"}, Habit::losesItsName);
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  EXPECT_LE(second.shown().size(), 10u);
}

TEST_F(LostServerTest, WhenTheBusGoesAnAlertIsDismissedAndNobodyCanBeAsked) {
  bus.end();
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  EXPECT_FALSE(alerts->show(question));
}

TEST_F(LostServerTest, AfterANewBusHasComeAlertsAreShownThere) {
  bus.end();
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  test::MessageBus next;
  const test::ScopedVariable there("DBUS_SESSION_BUS_ADDRESS", next.address());
  NotificationServer server;
  std::unique_ptr<UserAlert> shown;
  EXPECT_TRUE(waitUntil([&] { return (shown = alerts->show(question)) != nullptr; }));
  server.press(server.waitForShown(), server.waitForShown().keyOf("Allow"));
  EXPECT_EQ(shown->waitForResponse(), UserAlert::defaultButton);
}

/// The bus knows how to start a server; what it starts says so by making a file.
class StartableServerTest : public test::AlertsTest {
 protected:
  void SetUp() override { bus.addService("org.freedesktop.Notifications", "/usr/bin/touch " + sign); }
  void waitUntilStarted() {
    EXPECT_TRUE(waitUntil([&] { return ::access(sign.c_str(), F_OK) == 0; }));
    ::unlink(sign.c_str());
  }

  const test::TemporaryFolder folder;
  const std::string sign = folder / "started";
};

TEST_F(StartableServerTest, AServerThatDoesNotRunIsStartedAndStartedAgainWhenItGoes) {
  auto showing = std::async(std::launch::async, [&] { return alerts->show(question); });
  waitUntilStarted();
  auto server = std::make_unique<NotificationServer>();
  const auto alert = showing.get();
  ASSERT_TRUE(alert);
  auto waiting = waitFor(*alert);
  server.reset();
  waitUntilStarted();
  server = std::make_unique<NotificationServer>();
  const Shown again = server->waitForShown();
  server->press(again, again.keyOf("Allow"));
  EXPECT_EQ(waiting.get(), UserAlert::defaultButton);
}

}  // namespace
}  // namespace brivo
