// SPDX-License-Identifier: MIT
// With a notification server on a real message bus.
#include "platform/alerts/desktop_notifications.h"

#include "alerts/alerts_test.h"

namespace brivo {
namespace {

using test::NotificationServer;
using test::Shown;
using test::waitUntil;
using testing::ElementsAre;
using testing::IsEmpty;

class DesktopNotificationsTest : public test::AlertsTest {
 protected:
  /// How an alert is answered when `act` is done to its notification.
  UserAlert::Response answerTo(const std::function<void(NotificationServer&, const Shown&)>& act) {
    NotificationServer server;
    const auto alert = alerts->show(question);
    if (!alert) throw std::runtime_error("not shown");
    act(server, server.waitForShown());
    return alert->waitForResponse();
  }
};

TEST_F(DesktopNotificationsTest, AnAlertIsANotificationWithItsTextsAndButtonsThatStays) {
  NotificationServer server;
  const auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  const Shown shown = server.waitForShown();
  EXPECT_EQ(shown.application, "brivod");
  EXPECT_EQ(shown.icon, "camera-photo");
  EXPECT_EQ(shown.title, "May it?");
  EXPECT_EQ(shown.body, "It wants to.");
  EXPECT_EQ(shown.replaces, 0u);
  EXPECT_EQ(shown.timeout, 0);
  EXPECT_EQ(shown.urgency, 2);
  std::vector<std::string> labels;
  for (const auto& [key, label] : shown.actions) {
    EXPECT_NE(key, "default") << "that would be a click anywhere";
    labels.push_back(label);
  }
  EXPECT_THAT(labels, ElementsAre("Allow", "Do Not Allow", "Later"));
}

TEST_F(DesktopNotificationsTest, AButtonWithoutATextIsNotShown) {
  NotificationServer server;
  const auto alert = alerts->show({{"title", "May it?"}, {"defaultButton", "OK"}, {"otherButton", ""}});
  ASSERT_TRUE(alert);
  const Shown shown = server.waitForShown();
  ASSERT_EQ(shown.actions.size(), 1u);
  EXPECT_EQ(shown.actions[0].second, "OK");
}

TEST_F(DesktopNotificationsTest, TheDefaultButtonIsZero) {
  EXPECT_EQ(answerTo([](auto& server, auto& shown) { server.press(shown, shown.keyOf("Allow")); }), 0);
}

TEST_F(DesktopNotificationsTest, TheAlternateButtonIsOne) {
  EXPECT_EQ(answerTo([](auto& server, auto& shown) { server.press(shown, shown.keyOf("Do Not Allow")); }), 1);
}

TEST_F(DesktopNotificationsTest, TheOtherButtonIsTwo) {
  EXPECT_EQ(answerTo([](auto& server, auto& shown) { server.press(shown, shown.keyOf("Later")); }), 2);
}

TEST_F(DesktopNotificationsTest, AnAlertThatIsClosedOrExpiresIsDismissed) {
  for (const std::uint32_t reason : {1u, 2u, 3u, 4u, 77u}) {
    EXPECT_EQ(answerTo([&](auto& server, auto& shown) { server.close(shown, reason); }), 3) << reason;
  }
}

TEST_F(DesktopNotificationsTest, TheFirstAnswerCounts) {
  const auto answer = answerTo([](auto& server, auto& shown) {
    server.press(shown, shown.keyOf("Do Not Allow"));
    server.press(shown, shown.keyOf("Allow"));
    server.close(shown, 2);
  });
  EXPECT_EQ(answer, UserAlert::alternateButton);
}

TEST_F(DesktopNotificationsTest, AClickBesideTheButtonsIsNoAnswer) {
  NotificationServer server;
  const auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  const Shown shown = server.waitForShown();
  const auto waiting = waitFor(*alert);
  server.press(shown, "default");
  settle(server);
  EXPECT_FALSE(isAnswered(waiting));
  server.press(shown, shown.keyOf("Later"));
  waiting.wait();
}

TEST_F(DesktopNotificationsTest, AnAlertLeavesTheScreenWhenItsOwnerWithdrawsIt) {
  NotificationServer server;
  auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  const Shown shown = server.waitForShown();
  EXPECT_THAT(server.withdrawn(), IsEmpty());
  alert.reset();
  EXPECT_TRUE(waitUntil([&] { return !server.withdrawn().empty(); }));
  EXPECT_THAT(server.withdrawn(), ElementsAre(shown.id));
}

TEST_F(DesktopNotificationsTest, AnAlertThatIsAnsweredLeavesTheScreenOfAServerThatKeepsIt) {
  NotificationServer server;
  auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  const Shown shown = server.waitForShown();
  server.press(shown, shown.keyOf("Allow"));
  EXPECT_EQ(alert->waitForResponse(), UserAlert::defaultButton);
  alert.reset();
  EXPECT_TRUE(waitUntil([&] { return !server.withdrawn().empty(); }));
}

TEST_F(DesktopNotificationsTest, ANotificationThatWasClosedIsNotClosedAgain) {
  NotificationServer server;
  auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  server.close(server.waitForShown(), 2);
  EXPECT_EQ(alert->waitForResponse(), UserAlert::dismissed);
  alert.reset();
  { const auto another = alerts->show(question); }
  EXPECT_TRUE(waitUntil([&] { return !server.withdrawn().empty(); }));
  EXPECT_THAT(server.withdrawn(), ElementsAre(2)) << "its number may be somebody else's by now";
}

TEST_F(DesktopNotificationsTest, TwoAlertsAtOnceAreAnsweredEachByItsOwnButtons) {
  NotificationServer server;
  const auto first = alerts->show(question);
  const auto second = alerts->show(question);
  ASSERT_TRUE(first && second);
  const auto shown = server.shown();
  ASSERT_EQ(shown.size(), 2u);
  const auto waiting = waitFor(*first);
  server.press(shown[1], shown[1].keyOf("Do Not Allow"));
  EXPECT_EQ(second->waitForResponse(), UserAlert::alternateButton);
  EXPECT_FALSE(isAnswered(waiting));
  server.press(shown[0], shown[0].keyOf("Allow"));
  EXPECT_EQ(first->waitForResponse(), UserAlert::defaultButton);
}

TEST_F(DesktopNotificationsTest, ManyThreadsAskAtOnceAndEachGetsItsOwnAnswer) {
  NotificationServer server;
  constexpr int each = 10;
  std::vector<std::thread> askers;
  std::atomic<int> answered = 0;
  for (int asker = 0; asker < 8; ++asker) {
    askers.emplace_back([&, asker] {
      const char* button = asker % 2 == 0 ? "Allow" : "Later";
      const int expected = asker % 2 == 0 ? 0 : 2;
      for (int i = 0; i < each; ++i) {
        Dictionary mine = question;
        const std::string title = std::to_string(asker) + "." + std::to_string(i);
        mine.set("title", title);
        const auto alert = alerts->show(mine);
        if (!alert) continue;
        for (const Shown& shown : server.shown()) {
          if (shown.title == title) server.press(shown, shown.keyOf(button));
        }
        if (alert->waitForResponse() == expected) ++answered;
      }
    });
  }
  for (auto& asker : askers) asker.join();
  EXPECT_EQ(answered, 8 * each);
  EXPECT_TRUE(waitUntil([&] { return server.withdrawn().size() == 8u * each; }));
}

TEST_F(DesktopNotificationsTest, WhenTheAlertsEndNobodyWaitsAnyMoreAndTheScreenIsFree) {
  NotificationServer server;
  const auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  auto waiting = waitFor(*alert);
  endLoop();
  EXPECT_FALSE(isAnswered(waiting));
  alerts.reset();
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  EXPECT_TRUE(waitUntil([&] { return server.withdrawn().size() == 1; }));
}

TEST_F(DesktopNotificationsTest, AllAlertsCanBeDismissedAndNewOnesShown) {
  NotificationServer server;
  const auto first = alerts->show(question);
  const auto second = alerts->show(question);
  ASSERT_TRUE(first && second);
  auto waiting = waitFor(*first);
  onLoop([&] { alerts->dismissAll(); });
  EXPECT_EQ(waiting.get(), UserAlert::dismissed);
  EXPECT_EQ(second->waitForResponse(), UserAlert::dismissed);
  EXPECT_TRUE(waitUntil([&] { return server.withdrawn().size() == 2; }));
  EXPECT_TRUE(alerts->show(question));
}

TEST_F(DesktopNotificationsTest, AServerThatReadsMarkupGetsTheMessageEscaped) {
  const Dictionary tricky{{"title", "a < b & c"}, {"message", "<b>a</b> & \"c\""}, {"defaultButton", "<OK>"}};
  {
    NotificationServer server({"actions", "body", "body-markup"});
    ASSERT_TRUE(alerts->show(tricky));
    EXPECT_EQ(server.waitForShown().body, "&lt;b&gt;a&lt;/b&gt; &amp; \"c\"");
    EXPECT_EQ(server.waitForShown().title, "a < b & c") << "only the body has markup";
    EXPECT_EQ(server.waitForShown().actions[0].second, "<OK>");
  }
  NotificationServer server;
  ASSERT_TRUE(alerts->show(tricky));
  EXPECT_EQ(server.waitForShown().body, "<b>a</b> & \"c\"");
}

TEST_F(DesktopNotificationsTest, TextsOfAnyKindAndLengthArrive) {
  NotificationServer server;
  const std::string long1 = std::string(1 << 20, 'x');
  for (const std::string& text :
       {std::string("\xFF\xFE"), std::string("a\0b", 3), std::string("\xEF\xBF\xBE"),
        std::string("\xF0\x9F\xBF\xBF"), std::string("\xEF\xB7\x90"), std::string("\xED\xA0\x80"),
        std::string("\x1B[31m"), std::string(), long1}) {
    const auto before = server.shown().size();
    EXPECT_TRUE(alerts->show({{"title", text}, {"message", text}, {"defaultButton", "OK" + text}}));
    EXPECT_EQ(server.shown().size(), before + 1) << "connection still in use";
  }
}

}  // namespace
}  // namespace brivo
