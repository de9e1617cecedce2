// SPDX-License-Identifier: MIT
#include "daemon/device_manager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <thread>

#include "access/access_database.h"
#include "device/fake_connection.h"
#include "imaging/local_image_decoder.h"
#include "imaging/local_movie_reader.h"
#include "platform/zeph/connection_service.h"
#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using test::waitUntil;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

/// Reports what a test says.
class SaidDomains : public DomainMonitor {
 public:
  Token beginMonitoring(DomainChangeHandler changeHandler) override {
    handler = std::move(changeHandler);
    return works ? std::make_shared<int>(1) : nullptr;
  }
  void endMonitoring(const Token&) override { ++ended; }

  DomainChangeHandler handler;
  bool works = true;
  int ended = 0;
};

class NoPower : public PowerAssertions {
 public:
  Handle create(const std::string&, std::chrono::seconds) override { return nullptr; }
};

class DeviceManagerTest : public testing::Test {
 protected:
  ~DeviceManagerTest() override {
    if (manager) manager->stop();
    manager.reset();
    loop.quit();
    thread.join();
    pool.waitUntilIdle();
  }

  DeviceServices services() {
    return {pool,
            systemFiles(),
            images,
            movies,
            power,
            nullptr,
            [this]() -> std::shared_ptr<zeph::Listener> {
              if (noListeners) return nullptr;
              return *connections.anonymousListener(*folder);
            },
            [](const AuditToken&) { return std::nullopt; },
            [] { return Dictionary{}; },
            volumeStatistics};
  }

  std::shared_ptr<FakeConnection> connect(std::int32_t pid) {
    auto connection = std::make_shared<FakeConnection>(pid);
    manager->addRemoteManagerConnection(connection);
    return connection;
  }
  /// Reports the volumes at these paths as the whole of what is there, all with photos.
  void report(const std::vector<std::string>& paths) {
    std::map<std::string, StorageDomain> current;
    for (const std::string& path : paths) current[path] = {path, true, {Url::file(path)}};
    manager->domainsChanged(current);
  }
  std::vector<std::string> listed() const {
    std::vector<std::string> paths;
    const Dictionary list = manager->deviceList();
    for (const Value& context : *list.array(keys::kDeviceContexts)) {
      paths.push_back(*context.get<Dictionary>()->string(keys::kDevicePrimaryIdentifier));
    }
    return paths;
  }
  std::string uuidOf(const std::string& path) const {
    return manager->remoteDeviceWithURL(Url::file(path))->uuidString();
  }

  test::TemporaryFolder runtime;
  Pool pool;
  RunLoop loop;
  std::thread thread{[this] { loop.run(); }};
  zeph::ConnectionService connections{pool, nullptr};
  std::unique_ptr<zeph::RuntimeFolder> folder = std::move(zeph::RuntimeFolder::claim(runtime.path())).value();
  NoPower power;
  LocalImageDecoder images;
  LocalMovieReader movieReader;
  MovieService movies{movieReader, 1, 1};
  bool noListeners = false;
  SaidDomains domains;
  Transactions transactions;
  std::shared_ptr<MSRemoteCameraDeviceManager> manager =
      std::make_shared<MSRemoteCameraDeviceManager>(loop, domains, transactions, services());
};

TEST_F(DeviceManagerTest, MonitoringBeginsWhenThereIsATokenAndEndsWithTheManager) {
  EXPECT_TRUE(manager->startMSDeviceNotifications());
  domains.handler(std::map<std::string, StorageDomain>{{"a", {"a", true, {Url::file("/media/A")}}}});
  EXPECT_THAT(listed(), ElementsAre("/media/A"));
  manager->stop();
  EXPECT_EQ(domains.ended, 1);
}

TEST_F(DeviceManagerTest, WithoutATokenTheRegistryStaysEmpty) {
  domains.works = false;
  EXPECT_FALSE(manager->startMSDeviceNotifications());
  EXPECT_THAT(listed(), IsEmpty());
}

TEST_F(DeviceManagerTest, OfTwoVolumesThatVanishInOneChangeOnlyTheLastIsRemovedAndAnnounced) {
  report({"/media/A", "/media/B"});
  const auto client = connect(11);
  report({});
  EXPECT_THAT(listed(), ElementsAre("/media/A"));
  ASSERT_EQ(client->sentCount(), 1u);
  EXPECT_EQ(client->sent[0].first, selectors::kNotifyRemovedDevice);
  EXPECT_EQ(*client->note(0).string(keys::kDevicePrimaryIdentifier), "/media/B");
}

TEST_F(DeviceManagerTest, ADomainWithoutPhotosNeverYieldsARecord) {
  const test::StandardErrorCapture log;
  manager->domainsChanged(std::map<std::string, StorageDomain>{
      {"none", {"none", false, {Url::file("/media/A")}}}, {"some", {"some", true, {Url::file("/media/B")}}}});
  EXPECT_THAT(listed(), ElementsAre("/media/B"));
  EXPECT_THAT(log.text(), HasSubstr("                nope | none\n"));
  EXPECT_THAT(log.text(), HasSubstr("                 yes | some\n"));
  EXPECT_THAT(log.text(), HasSubstr("            MS Media | Added: B\n"));
}

TEST_F(DeviceManagerTest, AUrlThatIsNoFileUrlIsIgnored) {
  manager->domainsChanged(std::map<std::string, StorageDomain>{
      {"x", {"x", true, {Url("https://example.org/"), Url::file("/media/A")}}}});
  EXPECT_THAT(listed(), ElementsAre("/media/A"));
}

TEST_F(DeviceManagerTest, TheSameUrlTwiceIsOneRecordAndOneNotification) {
  const auto client = connect(11);
  report({"/media/A"});
  report({"/media/A"});
  manager->notifyClientMSDeviceAdded(Url::file("/media/A"));
  manager->domainsChanged(std::map<std::string, StorageDomain>{
      {"1", {"1", true, {Url::file("/media/A")}}},
      {"2", {"2", true, {Url::file("/media/A"), Url::file("/media/A")}}}});
  EXPECT_THAT(listed(), ElementsAre("/media/A"));
  EXPECT_EQ(client->sentCount(), 1u);
  EXPECT_EQ(client->sent[0].first, selectors::kNotifyAddedDevice);
  EXPECT_EQ(client->note(0), manager->remoteDeviceWithURL(Url::file("/media/A"))->deviceContext());
}

TEST_F(DeviceManagerTest, UrlsOfDifferentFormsButOnePathFindOneRecord) {
  report({"/media/A B"});
  const auto record = manager->remoteDeviceWithURL(Url::file("/media/A B"));
  ASSERT_TRUE(record);
  EXPECT_EQ(manager->remoteDeviceWithURL(Url("file:///media/A%20B/")), record);
  EXPECT_EQ(manager->remoteDeviceWithURL(Url("file://localhost/media/A%20B")), record);
  EXPECT_EQ(manager->remoteDeviceForUUID(record->uuidString()), record);
  EXPECT_EQ(manager->remoteDeviceForUUID("unknown"), nullptr);
}

TEST_F(DeviceManagerTest, AMonitoringErrorChangesNothingAndIsLogged) {
  report({"/media/A"});
  const test::StandardErrorCapture log;
  manager->domainsChanged(SystemError{"no monitor"});
  EXPECT_THAT(listed(), ElementsAre("/media/A"));
  EXPECT_THAT(log.text(), HasSubstr("! monitoring error: no monitor\n"));
}

TEST_F(DeviceManagerTest, AVolumeThatComesBackIsANewRecord) {
  report({"/media/A"});
  const std::string first = uuidOf("/media/A");
  report({});
  report({"/media/A"});
  EXPECT_NE(uuidOf("/media/A"), first);
}

TEST_F(DeviceManagerTest, ARemovalOfAnUnknownUrlDoesNothing) {
  const auto client = connect(11);
  manager->notifyClientMSDeviceRemoved(Url::file("/media/none"));
  EXPECT_EQ(client->sentCount(), 0u);
  EXPECT_FALSE(manager->removeRemoteCameraDevice(Url::file("/media/none")));
}

TEST_F(DeviceManagerTest, AnEmptyRegistryIsAnEmptyArray) {
  const Dictionary list = manager->deviceList();
  ASSERT_TRUE(list.array(keys::kDeviceContexts));
  EXPECT_THAT(listed(), IsEmpty());
}

TEST_F(DeviceManagerTest, DevicesAreListedInTheOrderOfArrival) {
  report({"/media/B"});
  report({"/media/A", "/media/B"});
  EXPECT_THAT(listed(), ElementsAre("/media/B", "/media/A"));
}

TEST_F(DeviceManagerTest, OpeningTwiceGivesTheSameEndpointAndUuidAndTheSecondReplyNothingElse) {
  report({runtime.path()});
  const Dictionary first = manager->openDevice(uuidOf(runtime.path()));
  const Dictionary second = manager->openDevice(uuidOf(runtime.path()));
  EXPECT_EQ(first.size(), 2u) << "before anybody has started using it";
  EXPECT_EQ(second.size(), 2u);
  const auto* endpoint = first.find(keys::kDeviceEndpoint)->get<Endpoint>();
  ASSERT_TRUE(endpoint);
  EXPECT_EQ(*endpoint, *second.find(keys::kDeviceEndpoint)->get<Endpoint>());
  EXPECT_EQ(*first.string(keys::kInternalDeviceUUID), uuidOf(runtime.path()));
  EXPECT_EQ(*second.string(keys::kInternalDeviceUUID), uuidOf(runtime.path()));
}

TEST_F(DeviceManagerTest, OpeningAnUnknownDeviceOrOneThatCannotBeMadeGivesNothing) {
  EXPECT_TRUE(manager->openDevice("unknown").empty());
  report({runtime.path()});
  noListeners = true;
  EXPECT_TRUE(manager->openDevice(uuidOf(runtime.path())).empty());
  noListeners = false;
  EXPECT_FALSE(manager->openDevice(uuidOf(runtime.path())).empty()) << "nothing was stored";
}

TEST_F(DeviceManagerTest, AVanishedVolumesDeviceIsClosedAndFreed) {
  report({runtime.path()});
  const std::string uuid = uuidOf(runtime.path());
  manager->openDevice(uuid);
  const std::weak_ptr<BrivoDevice> camera = manager->remoteDeviceForUUID(uuid)->camera();
  const test::StandardErrorCapture log;
  report({});
  EXPECT_TRUE(waitUntil([&] { return camera.expired(); }));
  pool.waitUntilIdle();
  EXPECT_THAT(log.text(), HasSubstr("| close device\n"));
  EXPECT_THAT(log.text(), HasSubstr("| close: " + uuid + "\n"));
  EXPECT_TRUE(manager->openDevice(uuid).empty());
}

TEST_F(DeviceManagerTest, ClosingOneOfTwoConnectionsOfAProcessEndsBothAndTheirTransaction) {
  const auto first = connect(11);
  const auto second = connect(11);
  const auto other = connect(12);
  EXPECT_EQ(transactions.count(), 2u) << "one per process";
  first->interruptionHandler();
  EXPECT_EQ(first->invalidated, 1);
  EXPECT_EQ(second->invalidated, 1);
  EXPECT_EQ(other->invalidated, 0);
  EXPECT_FALSE(second->interruptionHandler);
  EXPECT_EQ(manager->connectionCount(), 1u);
  EXPECT_EQ(transactions.count(), 1u);
}

TEST_F(DeviceManagerTest, RemovalWithMinus1EndsEveryConnectionAndTransaction) {
  const auto first = connect(11);
  const auto second = connect(12);
  const test::StandardErrorCapture log;
  manager->removeRemoteManagerConnection(-1);
  EXPECT_EQ(first->invalidated + second->invalidated, 2);
  EXPECT_EQ(manager->connectionCount(), 0u);
  EXPECT_EQ(transactions.count(), 0u);
  EXPECT_THAT(log.text(), HasSubstr("       -transactions | [00001]\n"));
  EXPECT_THAT(log.text(), HasSubstr("       -transactions | [00000]\n"));
}

TEST_F(DeviceManagerTest, AnEndHandlerActsAtMostOnce) {
  const auto first = connect(11);
  const Task handler = first->interruptionHandler;
  handler();
  const auto again = connect(11);
  handler();
  EXPECT_EQ(again->invalidated, 0);
  EXPECT_EQ(manager->connectionCount(), 1u);
}

TEST_F(DeviceManagerTest, RequestsAreAnsweredOnTheMainLoop) {
  report({runtime.path()});
  const auto ask = [&](std::string_view selector, zeph::Arguments arguments) {
    std::promise<std::pair<zeph::Answer, std::thread::id>> promise;
    auto answer = promise.get_future();
    manager->handle({connect(11), selector, std::move(arguments), zeph::Reply([&](zeph::Answer given) {
                       promise.set_value({std::move(given), std::this_thread::get_id()});
                     })});
    return answer.get();
  };
  const auto [list, listThread] = ask(selectors::kRequestDeviceList, {});
  EXPECT_EQ(listThread, thread.get_id());
  EXPECT_EQ(list->front().get<Dictionary>()->array(keys::kDeviceContexts)->size(), 1u);
  const auto [opened, openThread] = ask(selectors::kOpenDevice, {uuidOf(runtime.path())});
  EXPECT_EQ(openThread, thread.get_id());
  EXPECT_TRUE(opened->front().get<Dictionary>()->contains(keys::kDeviceEndpoint));
}

TEST_F(DeviceManagerTest, CallingTheCloseSelectorHasNoEffect) {
  report({runtime.path()});
  std::promise<bool> answered;
  manager->handle({connect(11),
                   selectors::kCloseDevice,
                   {uuidOf(runtime.path())},
                   zeph::Reply([&](const zeph::Answer& given) { answered.set_value(given.ok()); })});
  EXPECT_FALSE(answered.get_future().get()) << "nobody serves it";
  EXPECT_THAT(listed(), ElementsAre(runtime.path()));
}

}  // namespace
}  // namespace brivo
