// SPDX-License-Identifier: MIT
#include <gmock/gmock.h>

#include "orvidcore/client_test.h"
#include "support/environment.h"

namespace orvid::test {
namespace {

using brivo::test::ScopedVariable;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using testing::UnorderedElementsAre;

class DeviceBrowserTest : public ClientTest {
 protected:
  std::vector<std::string> names() const {
    const auto devices = browser->devices();
    std::vector<std::string> names;
    if (!devices.ok()) return {devices.error().text};
    for (const DeviceInfo& info : *devices) names.push_back(info.name);
    return names;
  }
};

TEST_F(DeviceBrowserTest, WithoutACardTheListIsEmpty) { EXPECT_THAT(names(), IsEmpty()); }

TEST_F(DeviceBrowserTest, ADeviceHasAHandleTheNameOfItsVolumeAndWhereItIs) {
  service.insertEmptyCard("EOS DIGITAL");
  const DeviceInfo info = waitForDevice("EOS DIGITAL");
  EXPECT_THAT(info.uuid, SizeIs(36));
  EXPECT_EQ(info.mountPath, service.card("EOS DIGITAL"));
}

TEST_F(DeviceBrowserTest, EveryCardIsListedAndTheAsynchronousListIsTheSame) {
  service.insertEmptyCard("A");
  service.insertEmptyCard("B");
  waitForDevice("A");
  waitForDevice("B");
  EXPECT_THAT(names(), UnorderedElementsAre("A", "B"));
  Outcome<std::vector<DeviceInfo>> outcome;
  browser->devicesAsync(outcome.callback());
  const auto listed = outcome.get();
  ASSERT_TRUE(listed.ok()) << listed.error().text;
  const auto again = browser->devices();
  ASSERT_TRUE(again.ok());
  ASSERT_THAT(*listed, SizeIs(2));
  for (std::size_t i : {0, 1}) EXPECT_EQ((*listed)[i].uuid, (*again)[i].uuid);
}

TEST_F(DeviceBrowserTest, DevicesThatComeAndGoAreToldInOrder) {
  std::string handle;
  BrowserEvents events;
  events.onAdded = [&](const DeviceInfo& info) {
    handle = info.uuid;
    told.add("added " + info.name + " " + info.mountPath);
  };
  events.onRemoved = [&](const DeviceInfo& info) {
    told.add("removed " + info.name + (info.uuid == handle ? " the same" : " another"));
  };
  browser->setEvents(std::move(events));
  service.insertEmptyCard("CARD");
  ASSERT_TRUE(told.waitFor("added CARD " + service.card("CARD")));
  service.removeCard("CARD");
  ASSERT_TRUE(told.waitFor("removed CARD the same"));
  EXPECT_THAT(told.events(), SizeIs(2));
  EXPECT_THAT(names(), IsEmpty());
}

TEST_F(DeviceBrowserTest, ReplacedEventsAreNotToldAnyMore) {
  Recorder before;
  Recorder after;
  BrowserEvents first;
  first.onAdded = [&](const DeviceInfo& info) { before.add(info.name); };
  browser->setEvents(std::move(first));
  service.insertEmptyCard("A");
  ASSERT_TRUE(before.waitFor("A"));
  BrowserEvents second;
  second.onAdded = [&](const DeviceInfo& info) { after.add(info.name); };
  browser->setEvents(std::move(second));
  service.insertEmptyCard("B");
  ASSERT_TRUE(after.waitFor("B"));
  EXPECT_THAT(before.events(), ElementsAre("A"));
  EXPECT_THAT(after.events(), ElementsAre("B")) << "what happened before is not told again";
}

TEST_F(DeviceBrowserTest, OpeningTwiceGivesOneSession) {
  service.insertEmptyCard("CARD");
  const DeviceInfo info = waitForDevice("CARD");
  const auto first = browser->open(info);
  ASSERT_TRUE(first.ok()) << first.error().text;
  EXPECT_EQ((*first)->info().uuid, info.uuid);
  const auto second = browser->open(info);
  ASSERT_TRUE(second.ok()) << second.error().text;
  const auto one = (*first)->start();
  const auto two = (*second)->start();
  ASSERT_TRUE(one.ok() && two.ok()) << "a second session would have been closed";
  EXPECT_EQ(*one, *two);
}

TEST_F(DeviceBrowserTest, ThreadsThatOpenADeviceAtOnceAllGetAWorkingSession) {
  service.insertEmptyCard("CARD");
  const DeviceInfo info = waitForDevice("CARD");
  std::vector<Outcome<std::shared_ptr<Device>>> outcomes(8);
  for (auto& outcome : outcomes) browser->openAsync(info, outcome.callback());
  for (const auto& outcome : outcomes) {
    const auto opened = outcome.get();
    ASSERT_TRUE(opened.ok()) << opened.error().text;
    const auto started = (*opened)->start();
    EXPECT_TRUE(started.ok()) << started.error().text;
  }
}

TEST_F(DeviceBrowserTest, OpeningADeviceThatIsNotThereIsAnError) {
  DeviceInfo unknown;
  unknown.uuid = "3437B8BD-8089-49B9-A6BE-0F16E501ADA0";
  EXPECT_EQ(kindOf(browser->open(unknown)), ErrorKind::disconnected);
  Outcome<std::shared_ptr<Device>> outcome;
  browser->openAsync(unknown, outcome.callback());
  EXPECT_EQ(kindOf(outcome.get()), ErrorKind::disconnected);
}

TEST_F(DeviceBrowserTest, ACardThatComesBackIsANewDeviceThatCanBeOpened) {
  service.addFile("CARD", "100ABCDE/IMG_0001.JPG", "x");
  const auto first = open("CARD");
  ASSERT_TRUE(first->start().ok());
  service.removeCard("CARD");
  ASSERT_TRUE(waitUntil([&] { return names().empty(); }));
  service.addFile("CARD", "100ABCDE/IMG_0001.JPG", "y");
  const auto second = open("CARD");
  EXPECT_NE(second->info().uuid, first->info().uuid);
  const auto objects = second->catalogue();
  ASSERT_TRUE(objects.ok()) << objects.error().text;
  EXPECT_THAT(*objects, SizeIs(3));
}

TEST(ServiceOfThisUserTest, WithoutAnAddressTheServiceIsFoundThroughTheEnvironment) {
  const RunningService service;
  service.insertEmptyCard("CARD");
  const ScopedVariable folder("BRIVOD_RUNTIME_DIR", service.runtimeFolder());
  const auto found = DeviceBrowser::connect();
  ASSERT_TRUE(found.ok()) << found.error().text;
  EXPECT_TRUE(waitUntil([&] {
    const auto devices = (*found)->devices();
    return devices.ok() && devices->size() == 1 && devices->front().name == "CARD";
  }));
}

TEST(NoServiceTest, ConnectingToNobodySaysThatThereIsNoService) {
  const brivo::test::TemporaryFolder folder;
  EXPECT_EQ(kindOf(DeviceBrowser::connect("unix:path=" + folder / "none")), ErrorKind::noService);
  EXPECT_EQ(kindOf(DeviceBrowser::connect("no address at all")), ErrorKind::noService);
}

class NotGrantedTest : public testing::Test {
 protected:
  NotGrantedTest() { service.addFile("CARD", "100ABCDE/IMG_0001.JPG", "x"); }

  RunningService service{RunningService::Grants::nobody};
};

TEST_F(NotGrantedTest, TheListIsOpenButEveryCallToTheDeviceIsRefused) {
  const auto browser = *DeviceBrowser::connect(service.address());
  std::vector<DeviceInfo> devices;
  ASSERT_TRUE(waitUntil([&] { return !(devices = *browser->devices()).empty(); }));
  const auto device = browser->open(devices.front());
  ASSERT_TRUE(device.ok()) << device.error().text;
  EXPECT_EQ(kindOf((*device)->start()), ErrorKind::refused);
  EXPECT_EQ(kindOf((*device)->catalogue()), ErrorKind::refused);
  EXPECT_EQ(kindOf((*device)->enumerate()), ErrorKind::refused);
  EXPECT_EQ(kindOf((*device)->registerInterests({"OVDeviceIsReady"})), ErrorKind::refused);
  Outcome<Dictionary> started;
  (*device)->startAsync(started.callback());
  EXPECT_EQ(kindOf(started.get()), ErrorKind::refused);
  Outcome<std::vector<Object>> listed;
  (*device)->catalogueAsync(listed.callback());
  EXPECT_EQ(kindOf(listed.get()), ErrorKind::refused);
  EXPECT_TRUE(browser->devices().ok()) << "the manager's connection is not touched";
}

}  // namespace
}  // namespace orvid::test
