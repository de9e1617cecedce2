// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_credentials.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <systemd/sd-bus.h>
#include <unistd.h>

#include "platform/bus/bus_message.h"
#include "support/environment.h"
#include "support/message_bus.h"

namespace brivo::zeph {
namespace {

class BusCredentialsTest : public testing::Test {
 protected:
  BusCredentialsTest() { EXPECT_GE(sd_bus_open_user(&bus), 0); }
  ~BusCredentialsTest() override { sd_bus_flush_close_unref(bus); }

  /// What is read of a message with these contents.
  template <class... Values>
  std::optional<BusCredentials> read(const char* types, Values... values) {
    BusMessage message;
    EXPECT_GE(sd_bus_message_new_signal(bus, message.out(), "/a", "a.b", "c"), 0);
    EXPECT_GE(sd_bus_message_append(message.get(), types, values...), 0);
    EXPECT_GE(sd_bus_message_seal(message.get(), 1, 0), 0);
    return readCredentials(message.get());
  }

  test::MessageBus daemon;
  test::ScopedVariable address{"DBUS_SESSION_BUS_ADDRESS", daemon.address()};
  sd_bus* bus = nullptr;
};

TEST_F(BusCredentialsTest, UserAndProcessAreReadAmongWhatElseIsSaid) {
  const auto credentials = read("a{sv}", 4, "LinuxSecurityLabel", "ay", 2, 'x', '\0', "ProcessID", "u", 4711u,
                                "UnixGroupIDs", "au", 2, 1u, 2u, "UnixUserID", "u", 1000u);
  ASSERT_TRUE(credentials);
  EXPECT_EQ(credentials->ids.pid, 4711);
  EXPECT_EQ(credentials->ids.uid, 1000u);
  EXPECT_FALSE(credentials->pidfd);
}

TEST_F(BusCredentialsTest, AProcessDescriptorOutlivesTheMessage) {
  int ends[2];
  ASSERT_EQ(::pipe(ends), 0);
  const UniqueFd sent(ends[0]);
  const UniqueFd other(ends[1]);
  const auto credentials =
      read("a{sv}", 3, "UnixUserID", "u", 0u, "ProcessID", "u", 1u, "ProcessFD", "h", sent.get());
  ASSERT_TRUE(credentials);
  struct stat expected {};
  struct stat found {};
  ASSERT_EQ(::fstat(sent.get(), &expected), 0);
  ASSERT_EQ(::fstat(credentials->pidfd.get(), &found), 0);
  EXPECT_EQ(found.st_ino, expected.st_ino);
}

TEST_F(BusCredentialsTest, WhatDoesNotNameUserAndProcessIsNobody) {
  EXPECT_FALSE(read("a{sv}", 0));
  EXPECT_FALSE(read("a{sv}", 1, "UnixUserID", "u", 0u));
  EXPECT_FALSE(read("a{sv}", 1, "ProcessID", "u", 1u));
  EXPECT_FALSE(read("a{sv}", 2, "UnixUserID", "u", 0u, "ProcessID", "u", 0u));
  EXPECT_FALSE(read("a{sv}", 2, "UnixUserID", "u", 0u, "ProcessID", "u", 0x80000000u));
  EXPECT_FALSE(read("a{sv}", 2, "UnixUserID", "s", "root", "ProcessID", "u", 1u));
  EXPECT_FALSE(read("s", "UnixUserID"));
}

}  // namespace
}  // namespace brivo::zeph
