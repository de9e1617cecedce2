// SPDX-License-Identifier: MIT
// What others on the bus, and the server itself, may send.
#include "alerts/alerts_test.h"

namespace brivo {
namespace {

using test::BusPeer;
using test::NotificationServer;
using test::Shown;

class HostileNotificationsTest : public test::AlertsTest {
 protected:
  void SetUp() override {
    alert = alerts->show(question);
    ASSERT_TRUE(alert);
    shown = server.waitForShown();
    waiting = waitFor(*alert);
  }
  /// Nothing before this was an answer; the real one still is.
  void expectUnanswered() {
    settle(server);
    EXPECT_FALSE(isAnswered(waiting));
    server.press(shown, shown.keyOf("Later"));
    EXPECT_EQ(waiting.get(), UserAlert::otherButton);
  }

  NotificationServer server;
  std::unique_ptr<UserAlert> alert;
  Shown shown;
  Waiting waiting;
};

TEST_F(HostileNotificationsTest, ASignalOfAStrangerIsNoAnswer) {
  BusPeer stranger;
  for (const std::string& destination : {shown.client, std::string()}) {
    stranger.signal(destination, "ActionInvoked", [&](sd_bus_message* signal) {
      sd_bus_message_append(signal, "us", shown.id, shown.keyOf("Allow").c_str());
    });
    stranger.signal(destination, "NotificationClosed",
                    [&](sd_bus_message* signal) { sd_bus_message_append(signal, "uu", shown.id, 2u); });
  }
  stranger.name();  // all that has been sent before an answer to this has gone out
  expectUnanswered();
}

TEST_F(HostileNotificationsTest, AStrangerCannotSayThatTheServerHasGone) {
  BusPeer stranger;
  const std::string own = stranger.name();
  stranger.run([&](sd_bus* peer) {
    sd_bus_message* signal = nullptr;
    sd_bus_message_new_signal(peer, &signal, "/org/freedesktop/DBus", "org.freedesktop.DBus",
                              "NameOwnerChanged");
    sd_bus_message_set_destination(signal, shown.client.c_str());
    sd_bus_message_append(signal, "sss", "org.freedesktop.Notifications", server.peer().name().c_str(),
                          own.c_str());
    EXPECT_GE(sd_bus_send(peer, signal, nullptr), 0);
    sd_bus_message_unref(signal);
  });
  expectUnanswered();
  EXPECT_EQ(server.shown().size(), 2u) << "with the one of settle(); nothing was shown again";
}

TEST_F(HostileNotificationsTest, ANotificationWithAnotherNumberIsNotOurs) {
  Shown other = shown;
  other.id += 1000;
  server.press(other, shown.keyOf("Allow"));
  server.close(other, 2);
  expectUnanswered();
}

TEST_F(HostileNotificationsTest, ButtonsOfANotificationThatReplacedOursAreNoAnswer) {
  for (const char* key : {"default", "0", "allow", "Allow", "defaultButton", "-0", ""})
    server.press(shown, key);
  expectUnanswered();
}

TEST_F(HostileNotificationsTest, TheButtonsOfAnotherAlertAreNoAnswer) {
  const auto another = alerts->show(question);
  ASSERT_TRUE(another);
  server.press(shown, server.shown()[1].keyOf("Allow"));
  expectUnanswered();
}

TEST_F(HostileNotificationsTest, SignalsWithOtherArgumentsAreIgnored) {
  test::BusPeer& peer = server.peer();
  for (const char* member : {"ActionInvoked", "NotificationClosed"}) {
    peer.signal("", member, [](sd_bus_message*) {});
    peer.signal("", member, [&](sd_bus_message* signal) { sd_bus_message_append(signal, "u", shown.id); });
    peer.signal("", member, [&](sd_bus_message* signal) {
      sd_bus_message_append(signal, "su", shown.keyOf("Allow").c_str(), shown.id);
    });
    peer.signal("", member,
                [&](sd_bus_message* signal) { sd_bus_message_append(signal, "ub", shown.id, 1); });
    peer.signal("", member, [](sd_bus_message* signal) { sd_bus_message_append(signal, "as", 2, "a", "b"); });
  }
  expectUnanswered();
}

TEST_F(HostileNotificationsTest, AFloodOfSignalsIsNoAnswer) {
  Shown other = shown;
  for (std::uint32_t i = 0; i < 2000; ++i) {
    other.id = shown.id + 1 + i;
    server.press(other, "default");
  }
  expectUnanswered();
}

class EarlySignalTest : public test::AlertsTest {};

TEST_F(EarlySignalTest, ANotificationThatIsClosedBeforeItsNumberIsKnownIsDismissed) {
  NotificationServer server({"actions"}, Habit::closesFirst);
  const auto alert = alerts->show(question);
  ASSERT_TRUE(alert);
  EXPECT_EQ(alert->waitForResponse(), UserAlert::dismissed);
}

}  // namespace
}  // namespace brivo
