// SPDX-License-Identifier: MIT
// What becomes of calls when the service or the browser goes.
#include <gmock/gmock.h>

#include <filesystem>
#include <thread>

#include "orvidcore/client_test.h"
#include "support/raw_dbus.h"

namespace orvid::test {
namespace {

using testing::Each;

/// Threads of this process.
std::size_t threadCount() {
  namespace fs = std::filesystem;
  return static_cast<std::size_t>(
      std::distance(fs::directory_iterator("/proc/self/task"), fs::directory_iterator()));
}

/// With the thread that a sanitizer makes when the first one is made.
const std::size_t kThreadsAtStart = [] {
  std::thread([] {}).join();
  return threadCount();
}();

bool allThreadsEnd() {
  return waitUntil([] { return threadCount() == kThreadsAtStart; });
}

class EndingTest : public ClientTest {
 protected:
  void recordEnds() {
    BrowserEvents browserEvents;
    browserEvents.onClosed = [this] { told.add("service"); };
    browser->setEvents(std::move(browserEvents));
    DeviceEvents deviceEvents;
    deviceEvents.onClosed = [this] { told.add("device"); };
    device->setEvents(std::move(deviceEvents));
  }

  /// Returns when nothing is left of it here, and the service has seen it go: it ends all connections of a
  /// process with one.
  void endBrowser() {
    browser.reset();
    ASSERT_TRUE(allThreadsEnd()) << threadCount();
    ASSERT_TRUE(waitUntil([this] { return service.log().find("-transactions") != std::string::npos; }));
  }
};

TEST_F(EndingTest, AKilledServiceIsTold) {
  onlyFile("x");
  recordEnds();
  service.kill();
  EXPECT_TRUE(told.waitFor("service"));
  EXPECT_TRUE(told.waitFor("device"));
  EXPECT_THAT(told.events(), testing::UnorderedElementsAre("service", "device"));
}

TEST_F(EndingTest, WhatIsPendingWhenTheServiceDiesIsDisconnected) {
  const Object object = onlyFile("0123456789");
  service.pause();
  std::vector<Outcome<Data>> reads(50);
  for (auto& read : reads) object.readAsync(0, 10, read.callback());
  Outcome<std::vector<DeviceInfo>> devices;
  browser->devicesAsync(devices.callback());
  Outcome<Done> saved;
  object.saveAsync(service.besides("saved"), saved.callback());
  std::thread blocking([&] { EXPECT_EQ(kindOf(object.metadata()), ErrorKind::disconnected); });
  service.kill();
  blocking.join();
  EXPECT_THAT(kindsOf(reads), Each(ErrorKind::disconnected));
  EXPECT_EQ(kindOf(devices.get()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(saved.get()), ErrorKind::disconnected);
  EXPECT_FALSE(std::filesystem::exists(service.besides("saved")));
}

TEST_F(EndingTest, ACatalogueThatIsAwaitedWhenTheServiceDiesIsDisconnected) {
  service.insertEmptyCard("CARD");
  device = open("CARD");
  ASSERT_TRUE(device->start().ok());
  service.pause();
  Outcome<std::vector<Object>> catalogue;
  device->catalogueAsync(catalogue.callback());
  service.kill();
  EXPECT_EQ(kindOf(catalogue.get()), ErrorKind::disconnected);
}

TEST_F(EndingTest, AfterTheServicesDeathEveryCallIsDisconnectedAtOnce) {
  const Object object = onlyFile("0123456789");
  recordEnds();
  service.kill();
  ASSERT_TRUE(told.waitFor("service"));
  ASSERT_TRUE(told.waitFor("device"));
  EXPECT_EQ(kindOf(browser->devices()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(device->start()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(object.read(0, 1)), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(object.thumbnail(160)), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(object.remove()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(object.save(service.besides("saved"))), ErrorKind::disconnected);
  DeviceInfo other;
  other.uuid = "another";
  EXPECT_EQ(kindOf(browser->open(other)), ErrorKind::disconnected);
  Outcome<std::vector<DeviceInfo>> devices;
  browser->devicesAsync(devices.callback());
  EXPECT_EQ(kindOf(devices.get()), ErrorKind::disconnected);
}

TEST_F(EndingTest, CallsThatMeetTheDeathOfTheServiceAllEnd) {
  const Object object = onlyFile(pattern(100'000));
  std::atomic<bool> dead = false;
  std::atomic<int> ended = 0;
  std::vector<std::thread> threads;
  for (int i = 0; i < 6; ++i) {
    threads.emplace_back([&] {
      while (!dead) (void)object.read(0, 100'000);
      ended += kindOf(object.read(0, 100'000)) == ErrorKind::disconnected ? 1 : 0;
    });
  }
  recordEnds();
  service.kill();
  EXPECT_TRUE(told.waitFor("device"));
  dead = true;
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(ended, 6);
}

TEST_F(EndingTest, EndingTheBrowserAnswersEveryPendingCallOnce) {
  const Object object = onlyFile("0123456789");
  const std::shared_ptr<Device> kept = device;
  service.pause();
  std::vector<Outcome<Data>> reads(50);
  for (auto& read : reads) object.readAsync(0, 10, read.callback());
  Outcome<std::vector<DeviceInfo>> devices;
  browser->devicesAsync(devices.callback());
  Outcome<Done> saved;
  object.saveAsync(service.besides("saved"), saved.callback());
  browser.reset();
  EXPECT_THAT(kindsOf(reads), Each(ErrorKind::disconnected));
  EXPECT_EQ(kindOf(devices.get()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(saved.get()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(kept->start()), ErrorKind::disconnected) << "its sessions end with the browser";
  service.goOn();
  for (const auto& read : reads) EXPECT_EQ(read.calls(), 1u);
  EXPECT_EQ(devices.calls() + saved.calls(), 2u);
}

TEST_F(EndingTest, EndingEverythingWithCallsPendingLeavesNoThreadAndNoDescriptor) {
  endBrowser();
  const std::size_t descriptors = brivo::test::openDescriptorCount();
  connect();
  auto object = std::make_unique<Object>(onlyFile("0123456789"));
  service.pause();
  std::vector<Outcome<Data>> reads(20);
  for (auto& read : reads) object->readAsync(0, 10, read.callback());
  object.reset();
  device.reset();
  browser.reset();
  EXPECT_THAT(kindsOf(reads), Each(ErrorKind::disconnected));
  service.goOn();
  EXPECT_TRUE(allThreadsEnd()) << threadCount();
  EXPECT_TRUE(waitUntil([&] { return brivo::test::openDescriptorCount() == descriptors; }));
  for (const auto& read : reads) EXPECT_EQ(read.calls(), 1u);
}

TEST_F(EndingTest, ABrowserMayEndInItsOwnCallback) {
  service.insertEmptyCard("CARD");
  waitForDevice("CARD");
  std::promise<void> ended;
  browser->devicesAsync([this, &ended](const Result<std::vector<DeviceInfo>>&) {
    browser.reset();
    ended.set_value();
  });
  EXPECT_EQ(ended.get_future().wait_for(std::chrono::seconds(20)), std::future_status::ready);
  EXPECT_TRUE(allThreadsEnd()) << threadCount();
}

TEST_F(EndingTest, ABrowserMayEndInADevicesEvent) {
  service.addFile("CARD", "100ABCDE/IMG_0001.JPG", "x");
  device = open("CARD");
  std::promise<void> ended;
  DeviceEvents events;
  events.onReady = [&](std::int32_t) {
    browser.reset();
    ended.set_value();
  };
  device->setEvents(std::move(events));
  ASSERT_TRUE(device->start().ok());
  (void)device->enumerate();
  EXPECT_EQ(ended.get_future().wait_for(std::chrono::seconds(20)), std::future_status::ready);
  EXPECT_TRUE(waitUntil([this] { return kindOf(device->start()) == ErrorKind::disconnected; }));
}

TEST_F(EndingTest, ManyBrowsersInTurnLeaveNothingBehind) {
  endBrowser();
  const std::size_t descriptors = brivo::test::openDescriptorCount();
  for (int i = 0; i < 20; ++i) {
    connect();
    Outcome<std::vector<DeviceInfo>> devices;
    browser->devicesAsync(devices.callback());
    browser.reset();
    const auto outcome = devices.get();
    EXPECT_TRUE(outcome.ok() || outcome.error().kind == ErrorKind::disconnected);
  }
  EXPECT_TRUE(allThreadsEnd()) << threadCount();
  EXPECT_TRUE(waitUntil([&] { return brivo::test::openDescriptorCount() == descriptors; }));
}

}  // namespace
}  // namespace orvid::test
