// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <filesystem>

#include "orvidcore/client_test.h"

namespace orvid::test {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::Ge;
using testing::Lt;
using testing::SizeIs;
using testing::UnorderedElementsAreArray;

constexpr std::uint32_t kTopLevel = 0xFFFFFFFE;

std::vector<std::string> pathsOf(const std::vector<Object>& objects) {
  std::vector<std::string> paths;
  for (const Object& object : objects) paths.push_back(object.info().path);
  return paths;
}

class DeviceTest : public ClientTest {
 protected:
  /// Has all that the device tells recorded; of items only their names.
  void record() {
    DeviceEvents events;
    events.onReady = [this](std::int32_t count) { told.add("ready " + std::to_string(count)); };
    events.onItems = [this](const std::vector<ObjectInfo>& items) {
      for (const ObjectInfo& info : items) told.add("item " + info.name);
    };
    events.onPercent = [this](std::uint32_t percent) { told.add("percent " + std::to_string(percent)); };
    events.onClosed = [this] { told.add("closed"); };
    device->setEvents(std::move(events));
  }
  void addThreePictures() {
    service.addFile("CARD", "100ABCDE/IMG_0001.JPG", "first");
    service.addFile("CARD", "100ABCDE/IMG_0002.JPG", "the second");
    service.addFile("CARD", "101ABCDE/IMG_0003.JPG", "");
  }
};

TEST_F(DeviceTest, StartingGivesTheProperties) {
  addThreePictures();
  device = open("CARD");
  const auto properties = device->start();
  ASSERT_TRUE(properties.ok()) << properties.error().text;
  EXPECT_EQ(*properties->string("OVDeviceName"), "CARD");
  EXPECT_EQ(*properties->string("OVDeviceVolumePath"), service.card("CARD"));
  EXPECT_EQ(*properties->string("OVInternalDeviceUUID"), device->info().uuid);
  EXPECT_EQ(properties->boolean("OVDeviceStarted"), true);
  EXPECT_EQ(properties->signedInteger("OVDeviceLocked"), 0);
  Outcome<Dictionary> again;
  device->startAsync(again.callback());
  const auto same = again.get();
  ASSERT_TRUE(same.ok()) << same.error().text;
  EXPECT_EQ(*same, *properties);
}

TEST_F(DeviceTest, TheCatalogueHasFoldersFirstEachInTheOrderOfHandles) {
  addThreePictures();
  const auto objects = catalogueOfCard();
  ASSERT_THAT(objects, SizeIs(6));
  EXPECT_THAT(pathsOf(objects), UnorderedElementsAreArray(
                                    {"DCIM", "DCIM/100ABCDE", "DCIM/101ABCDE", "DCIM/100ABCDE/IMG_0001.JPG",
                                     "DCIM/100ABCDE/IMG_0002.JPG", "DCIM/101ABCDE/IMG_0003.JPG"}));
  EXPECT_TRUE(std::ranges::is_partitioned(objects, [](const Object& o) { return o.info().isFolder; }));
  for (std::size_t i : {1, 2, 4, 5}) EXPECT_LT(objects[i - 1].info().handle, objects[i].info().handle) << i;
}

TEST_F(DeviceTest, AnObjectSaysWhatTheCardSays) {
  addThreePictures();
  const std::string path = service.card("CARD") + "/DCIM/100ABCDE/IMG_0002.JPG";
  const timespec times[2] = {{1'600'000'000, 0}, {1'600'000'000, 0}};
  ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
  const auto objects = catalogueOfCard();
  const Object dcim = named(objects, "DCIM");
  const Object folder = named(objects, "100ABCDE");
  const ObjectInfo info = named(objects, "IMG_0002.JPG").info();
  EXPECT_EQ(dcim.info().parent, kTopLevel);
  EXPECT_EQ(folder.info().parent, dcim.info().handle);
  EXPECT_EQ(info.parent, folder.info().handle);
  EXPECT_EQ(info.size, 10u);
  EXPECT_FALSE(info.isFolder);
  EXPECT_FALSE(info.isProtected);
  EXPECT_EQ(info.modified, 1'600'000'000u);
  EXPECT_GE(info.captured, 1'600'000'000u) << "when it was made, or changed where that is not known";
  EXPECT_EQ(info.thumbSize, 1u) << "there may be one of unknown size";
  EXPECT_EQ(info.width + info.height + info.orientation + info.thumbOffset + info.thumbWidth, 0u);
}

TEST_F(DeviceTest, ASecondCatalogueIsTheSameWithoutAnotherEnumeration) {
  addThreePictures();
  device = open("CARD");
  record();
  const auto first = device->catalogue();
  ASSERT_TRUE(first.ok()) << first.error().text;
  const auto second = device->catalogue();
  ASSERT_TRUE(second.ok()) << second.error().text;
  EXPECT_EQ(pathsOf(*second), pathsOf(*first));
  ASSERT_TRUE(told.waitFor("ready 6"));
  EXPECT_EQ(told.count("ready 6"), 1u);
}

TEST_F(DeviceTest, TheAsynchronousCatalogueIsTheSame) {
  addThreePictures();
  device = open("CARD");
  Outcome<std::vector<Object>> outcome;
  device->catalogueAsync(outcome.callback());
  const auto objects = outcome.get();
  ASSERT_TRUE(objects.ok()) << objects.error().text;
  EXPECT_EQ(pathsOf(*objects), pathsOf(catalogueOfCard()));
}

TEST_F(DeviceTest, AnEmptyCardHasItsMediaFolderAlone) {
  service.insertEmptyCard("CARD");
  EXPECT_THAT(pathsOf(catalogueOfCard()), ElementsAre("DCIM"));
}

TEST_F(DeviceTest, EverythingIsToldTheCountFirst) {
  addThreePictures();
  device = open("CARD");
  record();
  ASSERT_TRUE(device->start().ok());
  ASSERT_TRUE(device->enumerate().ok());
  for (const char* name : {"DCIM", "100ABCDE", "101ABCDE", "IMG_0001.JPG", "IMG_0002.JPG", "IMG_0003.JPG"}) {
    EXPECT_TRUE(told.waitFor("item " + std::string(name))) << name;
    EXPECT_EQ(told.count("item " + std::string(name)), 1u) << name;
  }
  ASSERT_TRUE(waitUntil([&] {
    const auto events = told.events();
    return std::ranges::any_of(events, [](const std::string& e) { return e.starts_with("percent "); });
  }));
  EXPECT_EQ(told.events().front(), "ready 6");
  EXPECT_EQ(told.count("closed"), 0u);
}

TEST_F(DeviceTest, TheNewestComeFirstWhenTheOptionsSaySo) {
  for (int i = 1; i <= 4; ++i) {
    const auto path = service.addFile("CARD", "100ABCDE/IMG_000" + std::to_string(i) + ".JPG", "x");
    const timespec times[2] = {{1'000'000 + i, 0}, {1'000'000 + i, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
  }
  device = open("CARD");
  record();
  ASSERT_TRUE(device->start().ok());
  Outcome<Done> begun;
  device->enumerateAsync({{"OVEnumerationChronologicalOrder", 1}}, begun.callback());
  ASSERT_TRUE(begun.get().ok());
  ASSERT_TRUE(told.waitFor("item IMG_0001.JPG"));
  std::vector<std::string> pictures;
  for (const std::string& event : told.events()) {
    if (event.starts_with("item IMG")) pictures.push_back(event.substr(5));
  }
  EXPECT_THAT(pictures, ElementsAre("IMG_0004.JPG", "IMG_0003.JPG", "IMG_0002.JPG", "IMG_0001.JPG"));
}

TEST_F(DeviceTest, ACatalogueOfFewerThanCountedSettlesAfterTheQuietTime) {
  addThreePictures();
  std::filesystem::create_symlink("nowhere", service.card("CARD") + "/DCIM/100ABCDE/IMG_0009.JPG");
  device = open("CARD");
  record();
  const auto begin = std::chrono::steady_clock::now();
  const auto objects = device->catalogue();
  const auto took = std::chrono::steady_clock::now() - begin;
  ASSERT_TRUE(objects.ok()) << objects.error().text;
  ASSERT_TRUE(told.waitFor("ready 7")) << "a link to nowhere is counted, and is no object";
  EXPECT_THAT(*objects, SizeIs(6));
  EXPECT_THAT(took, AllOf(Ge(std::chrono::seconds(1)), Lt(std::chrono::seconds(15))));
}

TEST_F(DeviceTest, AnObjectIsFoundByItsHandleOnceItHasArrived) {
  addThreePictures();
  device = open("CARD");
  EXPECT_FALSE(device->object(1)) << "nothing has arrived";
  const auto objects = catalogueOfCard();
  const Object picture = named(objects, "IMG_0001.JPG");
  const auto found = device->object(picture.info().handle);
  ASSERT_TRUE(found);
  EXPECT_EQ(found->info().path, picture.info().path);
  const auto bytes = found->read(0, 5);
  ASSERT_TRUE(bytes.ok()) << bytes.error().text;
  EXPECT_EQ(bytes->text(), "first");
  EXPECT_FALSE(device->object(4'000'000'000));
}

TEST_F(DeviceTest, InterestsAreRegistered) {
  service.insertEmptyCard("CARD");
  device = open("CARD");
  ASSERT_TRUE(device->start().ok());
  EXPECT_TRUE(device->registerInterests({"OVDeviceIsReady", "OVDownloadProgress"}).ok());
  EXPECT_TRUE(waitUntil([&] { return service.log().find("OVDownloadProgress") != std::string::npos; }));
  EXPECT_TRUE(device->registerInterests({}).ok());
}

TEST_F(DeviceTest, EventHandlersMayCallTheDevice) {
  addThreePictures();
  device = open("CARD");
  DeviceEvents events;
  events.onItems = [this](const std::vector<ObjectInfo>& items) {
    for (const ObjectInfo& info : items) {
      const auto object = device->object(info.handle);
      if (info.size != 5 || !object) continue;
      const auto bytes = object->read(0, 5);
      told.add(bytes.ok() ? std::string(bytes->text()) : bytes.error().text);
    }
  };
  device->setEvents(std::move(events));
  ASSERT_TRUE(device->catalogue().ok());
  EXPECT_TRUE(told.waitFor("first"));
}

TEST_F(DeviceTest, ARemovedVolumeClosesTheDeviceForGood) {
  addThreePictures();
  const auto objects = catalogueOfCard();
  record();
  service.removeCard("CARD");
  ASSERT_TRUE(told.waitFor("closed"));
  EXPECT_EQ(kindOf(device->start()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(device->enumerate()), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(named(objects, "IMG_0001.JPG").read(0, 1)), ErrorKind::disconnected);
  EXPECT_EQ(kindOf(named(objects, "IMG_0001.JPG").remove()), ErrorKind::disconnected);
  Outcome<Dictionary> metadata;
  named(objects, "IMG_0001.JPG").metadataAsync(metadata.callback());
  EXPECT_EQ(kindOf(metadata.get()), ErrorKind::disconnected);
  EXPECT_EQ(told.events().back(), "closed") << "nothing comes after it";
  EXPECT_EQ(told.count("closed"), 1u);
  EXPECT_TRUE(browser->devices().ok()) << "the service itself is there";
}

TEST_F(DeviceTest, ADeviceThatOnlyTheBrowserHoldsTellsThatItClosed) {
  addThreePictures();
  device = open("CARD");
  record();
  ASSERT_TRUE(device->start().ok());
  device.reset();
  service.removeCard("CARD");
  EXPECT_TRUE(told.waitFor("closed"));
}

TEST_F(DeviceTest, AClosedDeviceHasNoCatalogueAnyMore) {
  addThreePictures();
  catalogueOfCard();
  record();
  service.removeCard("CARD");
  ASSERT_TRUE(told.waitFor("closed"));
  const auto before = told.events();
  EXPECT_EQ(kindOf(device->catalogue()), ErrorKind::disconnected);
  EXPECT_EQ(told.events(), before) << "nothing was sent again";
}

}  // namespace
}  // namespace orvid::test
