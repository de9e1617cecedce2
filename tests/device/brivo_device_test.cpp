// SPDX-License-Identifier: MIT
// A whole device with its endpoint, and a client at the other end of a real socket.
#include "device/brivo_device.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <future>
#include <set>

#include "access/access_database.h"
#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "platform/zeph/connection_service.h"
#include "protocol/keys.h"
#include "protocol/protocols.h"
#include "protocol/selectors.h"
#include "ptp/object_info_dataset.h"
#include "support/raw_dbus.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using test::waitUntil;
using testing::ElementsAre;
using testing::HasSubstr;
using zeph::Answer;
using namespace std::chrono_literals;

class CountingPower : public PowerAssertions {
 public:
  Handle create(const std::string& name, std::chrono::seconds timeout) override {
    ++made;
    lastName = name;
    lastTimeout = timeout;
    ++held;
    return Handle(this, [this](void*) { --held; });
  }

  std::atomic<int> made = 0;
  std::atomic<int> held = 0;
  std::string lastName;
  std::chrono::seconds lastTimeout{0};
};

class NoApplications : public InstalledApplications {
 public:
  bool isInstalled(const std::string&) const override { return false; }
  std::optional<std::string> identifierOfProgram(dev_t, ino_t) const override { return std::nullopt; }
};

/// Keeps the signals of a client.
class Collector : public zeph::ExportedObject {
 public:
  void handle(zeph::Invocation invocation) override {
    const std::lock_guard lock(mutex);
    received.emplace_back(invocation.selector, invocation.arguments.front());
  }
  std::size_t count(std::string_view selector) {
    const std::lock_guard lock(mutex);
    return static_cast<std::size_t>(
        std::ranges::count(received, selector, [](const auto& one) { return one.first; }));
  }
  std::set<std::string> names() {
    const std::lock_guard lock(mutex);
    std::set<std::string> names;
    for (const auto& [selector, note] : received) {
      if (selector != selectors::kNotifyAddedItems) continue;
      for (const Value& dataset : *note.get<Dictionary>()->array(keys::kObjectInfoArray)) {
        names.insert(MSObjectInfoDataset(*dataset.get<Data>()).filename());
      }
    }
    return names;
  }

  std::mutex mutex;
  std::vector<std::pair<std::string, Value>> received;
};

class BrivoDeviceTest : public testing::Test {
 protected:
  BrivoDeviceTest() {
    test::makeFolder(card / "CARD");
    device = BrivoDevice::initWithURL(Url::file(card / "CARD"), services());
    device->setCameraProperty(keys::kDeviceEndpoint, device->endpoint());
    device->setCameraProperty(keys::kInternalDeviceUUID, "REGISTRY-UUID");
  }
  ~BrivoDeviceTest() override {
    device.reset();
    pool.waitUntilIdle();
  }

  DeviceServices services() {
    return {pool,
            systemFiles(),
            images,
            movies,
            power,
            access,
            [this]() -> std::shared_ptr<zeph::Listener> {
              auto listener = connections.anonymousListener(*folder);
              return listener.ok() ? *std::move(listener) : nullptr;
            },
            [this](const AuditToken&) {
              ++identityQueries;
              return identity;
            },
            [this] { return matchingList; },
            [this](const std::string&) { return statistics; }};
  }
  void addFile(const std::string& path, const std::string& content = "x") {
    test::writeFile(card / ("CARD/" + path), content);
  }
  std::shared_ptr<zeph::Connection> connect() {
    auto connection = std::move(connections.connect(device->endpoint(), 10s)).value();
    connection->setExportedInterface(zeph::Interface(korvelProtocol()));
    connection->setRemoteObjectInterface(zeph::Interface(korvelProtocol()));
    connection->setExportedObject(collector);
    connection->resume();
    return connection;
  }
  static Answer call(const std::shared_ptr<zeph::Connection>& client, std::string_view selector,
                     zeph::Arguments arguments = {}) {
    auto promise = std::make_shared<std::promise<Answer>>();
    auto answer = promise->get_future();
    client->remoteObjectProxyWithErrorHandler(nullptr).call(
        selector, std::move(arguments), 20s,
        [promise](Answer given) { promise->set_value(std::move(given)); });
    return answer.get();
  }
  Dictionary start(const std::shared_ptr<zeph::Connection>& client) {
    const Answer answer = call(client, selectors::kRequestStartUsing);
    EXPECT_TRUE(answer.ok());
    return answer.ok() ? *answer->front().get<Dictionary>() : Dictionary();
  }

  test::TemporaryFolder card;
  test::TemporaryFolder home;
  test::TemporaryFolder runtime;
  Pool pool;
  zeph::ConnectionService connections{pool, nullptr};
  std::unique_ptr<zeph::RuntimeFolder> folder = std::move(zeph::RuntimeFolder::claim(runtime.path())).value();
  CountingPower power;
  LocalImageDecoder images;
  LocalMovieReader movieReader;
  MovieService movies{movieReader, 1, 1};
  NoApplications applications;
  AccessDatabase database{pool, home / "data"};
  OVDeviceAccessManager manager{database, applications, nullptr};
  OVDeviceAccessManager* access = &manager;
  std::optional<std::string> identity = "org.orvid.OrvidCoreTests";
  std::atomic<int> identityQueries = 0;
  std::optional<Dictionary> matchingList = Dictionary{};
  VolumeStatistics statistics;
  std::shared_ptr<Collector> collector = std::make_shared<Collector>();
  std::shared_ptr<BrivoDevice> device;
};

TEST_F(BrivoDeviceTest, BeforeTheFirstStartThereIsNoNameAndNoPath) {
  EXPECT_EQ(device->name(), "");
  EXPECT_EQ(device->filesystemPath(), std::nullopt);
  EXPECT_EQ(device->internalUUID(), "REGISTRY-UUID");
  EXPECT_EQ(device->cameraDictionary().size(), 2u);
}

TEST_F(BrivoDeviceTest, OfNoUrlNoDeviceIsMade) {
  EXPECT_EQ(BrivoDevice::initWithURL(std::nullopt, services()), nullptr);
}

TEST_F(BrivoDeviceTest, WithoutAListenerNoDeviceIsMade) {
  DeviceServices without = services();
  without.makeListener = [] { return nullptr; };
  EXPECT_EQ(BrivoDevice::initWithURL(Url::file(card / "CARD"), without), nullptr);
}

TEST_F(BrivoDeviceTest, StartingCompletesTheProperties) {
  test::makeFolder(card / "CARD/DCIM");
  const auto client = connect();
  const Dictionary properties = start(client);
  EXPECT_EQ(*properties.string("OVDeviceName"), "CARD");
  EXPECT_EQ(properties.boolean("OVDeviceEjectable"), true);
  EXPECT_EQ(*properties.find("OVDeviceLocked")->get<std::int32_t>(), 0);
  EXPECT_EQ(properties.string("OVDeviceUUIDString")->size(), 36u);
  EXPECT_NE(*properties.string("OVDeviceUUIDString"), "REGISTRY-UUID");
  EXPECT_EQ(properties.boolean("OVDeviceAllowsSyncingClock"), false);
  EXPECT_EQ(*properties.string("OVDeviceTransportType"), "OVTransportTypeMassStorage");
  EXPECT_EQ(*properties.string("OVDeviceProductType"), "Camera");
  EXPECT_EQ(*properties.string("OVDeviceVolumePath"), card / "CARD");
  EXPECT_EQ(properties.boolean("OVDeviceStarted"), true);
  EXPECT_EQ(*properties.string("OVInternalDeviceUUID"), "REGISTRY-UUID");
  EXPECT_EQ(*properties.string("OVDeviceEndpoint"), device->endpoint().address);
  EXPECT_EQ(properties.size(), 11u);
  EXPECT_EQ(device->name(), "CARD");
  EXPECT_EQ(device->filesystemPath(), card / "CARD");
  EXPECT_THAT(device->mediaPaths(), ElementsAre("DCIM"));
}

TEST_F(BrivoDeviceTest, TheSecondStartGivesTheSameDictionaryAndDoesNotResetTheCount) {
  const auto client = connect();
  const Dictionary first = start(client);
  device->counters().incrementPreflightObjectCount(5);
  EXPECT_EQ(start(client), first);
  EXPECT_EQ(device->counters().preflightCount(), 5);
  EXPECT_THAT(device->mediaPaths(), ElementsAre("DCIM"));
}

TEST_F(BrivoDeviceTest, LockedIsBit0OfTheMountFlagsAndNoOther) {
  statistics.flags = 0xFFFE;
  {
    const auto client = connect();
    EXPECT_EQ(start(client).signedInteger("OVDeviceLocked"), 0);
    EXPECT_FALSE(device->isLocked());
  }
  statistics.flags = 0x1001;
  device = BrivoDevice::initWithURL(Url::file(card / "CARD"), services());
  EXPECT_EQ(start(connect()).signedInteger("OVDeviceLocked"), 1);
  EXPECT_TRUE(device->isLocked());
}

TEST_F(BrivoDeviceTest, AnUnqualifiedVolumeIsServedAsIfItHadADcim) {
  matchingList = std::nullopt;
  const auto client = connect();
  const test::StandardErrorCapture log;
  start(client);
  EXPECT_THAT(device->mediaPaths(), ElementsAre("DCIM"));
  EXPECT_THAT(log.text(),
              HasSubstr("⚠️⚠️⚠️⚠️ ! Failed -- force continuing: " + (card / "CARD")));
  EXPECT_THAT(log.text(), HasSubstr("fsInfo | f_flags: 0, f_fstypename: , f_mntonname: , f_mntfromname: \n"));
}

TEST_F(BrivoDeviceTest, ASecondConnectionOfAnAdmittedProcessIsRefused) {
  const auto first = connect();
  start(first);
  const auto second = connect();
  EXPECT_FALSE(call(second, selectors::kRequestStartUsing).ok());
  EXPECT_TRUE(call(first, selectors::kRequestStartUsing).ok()) << "the first goes on";
  first->invalidate();
  ASSERT_TRUE(waitUntil([&] { return device->numberOfClients() == 0; }));
  EXPECT_FALSE(call(connect(), selectors::kRequestStartUsing).ok()) << "also when the first is gone";
}

TEST_F(BrivoDeviceTest, ARefusedProcessIsRefusedAgainWithoutAskingTheAccessManager) {
  identity = "org.example.Unknown";
  EXPECT_FALSE(call(connect(), selectors::kRequestStartUsing).ok());
  database.addApplicationWithBundleIdentifier("org.example.Unknown", true);
  EXPECT_FALSE(call(connect(), selectors::kRequestStartUsing).ok()) << "the decision stands for the process";
  EXPECT_THAT(database.bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.Unknown"))
      << "the second time nobody looked, or the grant of what is not installed would be gone";
}

TEST_F(BrivoDeviceTest, WithoutAnAccessManagerOrAnIdentityEveryClientIsRefused) {
  access = nullptr;
  device = BrivoDevice::initWithURL(Url::file(card / "CARD"), services());
  EXPECT_FALSE(call(connect(), selectors::kRequestStartUsing).ok());
  access = &manager;
  identity = std::nullopt;
  device = BrivoDevice::initWithURL(Url::file(card / "CARD"), services());
  EXPECT_FALSE(call(connect(), selectors::kRequestStartUsing).ok());
}

TEST_F(BrivoDeviceTest, AMethodThatTheDeviceDoesNotServeIsUnknown) {
  const auto client = connect();
  for (const auto selector :
       {selectors::kOpenDeviceSession, selectors::kSendPTPCommand, selectors::kPtpEventForwarding}) {
    const Answer answer = call(client, selector);
    ASSERT_FALSE(answer.ok());
    EXPECT_EQ(answer.error().name, zeph::kErrorUnknownMethod) << selector;
  }
  EXPECT_TRUE(call(client, selectors::kRequestStartUsing).ok());
}

TEST_F(BrivoDeviceTest, AClientGetsTheCatalogueReadsAndDeletes) {
  addFile("DCIM/100ABCDE/IMG_0001.JPG", "picture");
  addFile("DCIM/100ABCDE/IMG_0001.CR2", "raw");
  const auto client = connect();
  start(client);
  ASSERT_TRUE(call(client, selectors::kEnumerateContent, {Dictionary{}}).ok());
  const std::set<std::string> expected{"DCIM", "100ABCDE", "IMG_0001.JPG", "IMG_0001.CR2"};
  ASSERT_TRUE(waitUntil([&] { return collector->names() == expected; }));
  EXPECT_EQ(collector->count(selectors::kPostNotification), 1u);
  EXPECT_EQ(collector->received.front().first, selectors::kPostNotification) << "ready comes first";

  std::uint64_t handle = 0;
  for (const auto& item : device->index().copyIndexedFoldersAndFiles()) {
    if (item->name() == "IMG_0001.JPG") handle = item->objHandle();
  }
  const Answer read = call(client, selectors::kRequestReadData, {handle, Dictionary{{"OVReadLength", 4}}});
  ASSERT_TRUE(read.ok());
  EXPECT_EQ(read->front().get<Dictionary>()->data("OVReadData")->text(), "pict");
  const Answer deleted = call(client, selectors::kRequestDelete, {handle, Dictionary{}});
  EXPECT_EQ(deleted->front().get<Dictionary>()->signedInteger("errCode"), 0);
  EXPECT_FALSE(std::filesystem::exists(card / "CARD/DCIM/100ABCDE/IMG_0001.JPG"));
  for (const auto selector : {selectors::kRequestMetadata, selectors::kRequestThumbnail}) {
    const Answer answer = call(client, selector, {handle, Dictionary{}});
    EXPECT_EQ(answer->front().get<Dictionary>()->signedInteger("errCode"), -21450) << selector;
  }
  const Answer download = call(client, selectors::kRequestDownload, {handle, Dictionary{{"mine", 1}}});
  EXPECT_EQ(download->front().get<Dictionary>()->signedInteger("errCode"), -9934);
}

TEST_F(BrivoDeviceTest, InterestsAreThoseOfTheCaller) {
  const auto client = connect();
  ASSERT_TRUE(call(client, selectors::kRegisterInterests, {Array{"note"}}).ok());
  EXPECT_EQ(device->clientManager().clientConnectionsMonitoringNotification("note").size(), 1u);
  ASSERT_TRUE(call(client, selectors::kUnregisterInterests, {Array{"note"}}).ok());
  EXPECT_EQ(device->clientManager().clientConnectionsMonitoringNotification("note").size(), 0u);
}

TEST_F(BrivoDeviceTest, HoldingTwiceMakesOneAssertionAndReleasingWithoutOneDoesNothing) {
  device->releasePowerAssertion();
  device->holdPowerAssertion();
  device->holdPowerAssertion();
  EXPECT_EQ(power.made, 1);
  EXPECT_EQ(power.held, 1);
  EXPECT_EQ(power.lastTimeout, 120s);
  EXPECT_EQ(power.lastName, "org.orvid.brivod-zeph+");
  device->releasePowerAssertion();
  EXPECT_EQ(power.held, 0);
  device->releasePowerAssertion();
}

TEST_F(BrivoDeviceTest, ARequestHoldsThePowerAssertionAndADownloadDoesNot) {
  const auto client = connect();
  start(client);
  EXPECT_TRUE(call(client, selectors::kRequestDownload, {std::uint64_t{1}, Dictionary{}}).ok());
  EXPECT_EQ(power.made, 0);
  EXPECT_TRUE(call(client, selectors::kRequestReadData, {std::uint64_t{1}, Dictionary{}}).ok());
  EXPECT_EQ(power.made, 1);
  EXPECT_EQ(power.lastName, "org.orvid.brivod-zeph+CARD");
  EXPECT_TRUE(waitUntil([&] { return power.held == 0; }));
}

TEST_F(BrivoDeviceTest, EjectSaysYesAndTheVolumeStays) {
  addFile("DCIM/x");
  EXPECT_TRUE(BrivoDevice::eject());
  EXPECT_FALSE(device->beingEjected());
  EXPECT_TRUE(std::filesystem::exists(card / "CARD/DCIM/x"));
}

TEST_F(BrivoDeviceTest, UpdateCatalogingDoneSendsTheComputedValueBeforeItCountsAsDone) {
  const auto client = connect();
  start(client);
  device->updateCatalogingDone();
  ASSERT_TRUE(waitUntil([&] { return collector->count(selectors::kNotifyPercentCompleted) == 1; }));
  EXPECT_EQ(collector->received.back().second, Value(std::uint32_t{0}));
  EXPECT_EQ(device->counters().contentCatalogPercentCompleted(), 100u);
}

TEST_F(BrivoDeviceTest, AClientThatDiesWithAnOpenStreamLeavesNoDescriptorOnTheVolume) {
  addFile("DCIM/100ABCDE/IMG_0001.JPG", "picture");
  const auto client = connect();
  start(client);
  ASSERT_TRUE(call(client, selectors::kEnumerateContent, {Dictionary{}}).ok());
  ASSERT_TRUE(waitUntil([&] { return device->counters().enumeratedItemCount() == 1; }));
  const auto file = std::dynamic_pointer_cast<BrivoFile>(device->index().copyIndexedFoldersAndFiles().back());
  EXPECT_TRUE(call(client, selectors::kRequestReadData,
                   {std::uint64_t{file->objHandle()}, Dictionary{{"OVReadBufferStreamOpen", true}}})
                  .ok());
  EXPECT_EQ(file->fileOpenCount(), 1u);
  client->invalidate();
  EXPECT_TRUE(waitUntil([&] { return file->fileOpenCount() == 0; }));
}

TEST_F(BrivoDeviceTest, RemovingAllClientsEndsThemAndTheDevicesEndFreesEverything) {
  const test::StandardErrorCapture log;
  const std::size_t before = test::openDescriptorCount();
  for (int i = 0; i < 300; ++i) addFile("DCIM/100ABCDE/IMG_" + std::to_string(1000 + i) + ".JPG");
  device = BrivoDevice::initWithURL(Url::file(card / "CARD"), services());
  auto client = connect();
  std::binary_semaphore ended(0);
  client->setInterruptionHandler([&] { ended.release(); });
  start(client);
  ASSERT_TRUE(call(client, selectors::kEnumerateContent, {Dictionary{}}).ok());
  device->removeAllClients();
  device.reset();  // perhaps in the middle of the walk
  EXPECT_TRUE(ended.try_acquire_for(20s));
  EXPECT_FALSE(call(client, selectors::kRequestStartUsing).ok());
  client.reset();
  pool.waitUntilIdle();
  EXPECT_THAT(log.text(), HasSubstr("brivodevice |     dealloc path - CARD"));
  EXPECT_TRUE(waitUntil([&] { return test::openDescriptorCount() <= before; }));
}

}  // namespace
}  // namespace brivo
