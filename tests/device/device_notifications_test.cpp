// SPDX-License-Identifier: MIT
#include "device/device_notifications.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "content/recording_device.h"
#include "device/catalogue_replay.h"
#include "device/fake_connection.h"
#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "ptp/object_info_dataset.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/log.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class DeviceNotificationsTest : public testing::Test {
 protected:
  std::shared_ptr<FakeConnection> add(std::int32_t pid) {
    auto connection = std::make_shared<FakeConnection>(pid);
    clients->addClientWithConnection(connection);
    return connection;
  }

  std::shared_ptr<OVClientManager> clients = std::make_shared<OVClientManager>([](const Task&) {});
  CatalogueCounters counters;
  DeviceNotifications notifications{*clients, counters, [] { return "THE-UUID"; }};
};

TEST_F(DeviceNotificationsTest, GenericNotesCarryTheDeviceAndNotesWithASelectorDoNot) {
  const auto client = add(11);
  notifications.sendNotification(Dictionary{{"type", "x"}});
  notifications.sendNotification(Dictionary{{"type", "x"}}, std::nullopt, selectors::kNotifyAddedItems);
  ASSERT_EQ(client->sent.size(), 2u);
  EXPECT_EQ(client->sent[0].first, selectors::kPostNotification);
  EXPECT_EQ(client->note(0), (Dictionary{{"type", "x"}, {"OVInternalDeviceUUID", "THE-UUID"}}));
  EXPECT_EQ(client->sent[1].first, selectors::kNotifyAddedItems);
  EXPECT_EQ(client->note(1), (Dictionary{{"type", "x"}}));
}

TEST_F(DeviceNotificationsTest, NoListMeansAllClientsAndAnEmptyListNobody) {
  const auto first = add(11);
  const auto second = add(12);
  notifications.sendNotification(Dictionary{});
  notifications.sendNotification(Dictionary{}, Connections{});
  notifications.sendNotification(Dictionary{}, Connections{second});
  EXPECT_EQ(first->sent.size(), 1u);
  EXPECT_EQ(second->sent.size(), 2u);
}

TEST_F(DeviceNotificationsTest, ANoteTypeGoesToThoseWhoAreInterested) {
  const auto first = add(11);
  const auto second = add(12);
  clients->addNotifications({"wanted"}, 12);
  notifications.sendNotification(Dictionary{}, std::string("wanted"), selectors::kPostNotification);
  EXPECT_THAT(first->sent, IsEmpty());
  EXPECT_EQ(second->sent.size(), 1u);
}

TEST_F(DeviceNotificationsTest, ProgressOfAnObjectThatNobodyMonitorsGoesNowhere) {
  const auto client = add(11);
  notifications.sendNotificationDownloadProgressForObject(7, 100, 50.0);
  EXPECT_THAT(client->sent, IsEmpty());
}

TEST_F(DeviceNotificationsTest, ProgressGoesToWhoeverWorksOnTheObject) {
  const auto client = add(11);
  add(12);
  clients->setClientUsingObjectHandle(11, 7);
  notifications.sendNotificationDownloadProgressForObject(7, 100, 12.5);
  ASSERT_EQ(client->sent.size(), 1u);
  EXPECT_EQ(client->sent[0].first, selectors::kPostNotification);
  EXPECT_EQ(client->note(0), (Dictionary{{"type", "OVDownloadProgress"},
                                         {"OVDownloadedBytes", std::uint64_t{100}},
                                         {"OVDownloadedPercent", 12.5},
                                         {"OVObjectID", std::uint32_t{7}},
                                         {"OVInternalDeviceUUID", "THE-UUID"}}));
}

TEST_F(DeviceNotificationsTest, ThePercentageIsABareNumber) {
  const auto client = add(11);
  counters.setMsObjectCount(2);
  counters.updateEnumeratedItemCountWithDelta(1);
  notifications.sendNotificationContentCatalogPercentCompleted();
  ASSERT_EQ(client->sent.size(), 1u);
  EXPECT_EQ(client->sent[0].first, selectors::kNotifyPercentCompleted);
  EXPECT_THAT(*client->sent[0].second, ElementsAre(Value(std::uint32_t{50})));
}

TEST_F(DeviceNotificationsTest, ABatchCarriesTheDatasetsTheCountAndThePercentage) {
  const auto client = add(11);
  counters.setMsObjectCount(4);
  counters.updateEnumeratedItemCountWithDelta(1);
  Array datasets(Array::Kind::data);
  datasets.append(Data::copyOf("dataset"));
  notifications.flushNotifications(std::move(datasets));
  ASSERT_EQ(client->sent.size(), 1u);
  EXPECT_EQ(client->sent[0].first, selectors::kNotifyAddedItems);
  const Dictionary& batch = client->note(0);
  EXPECT_EQ(batch, (Dictionary{{"OVMSObjectInfoArray", Array{Data::copyOf("dataset")}},
                               {"OVANumberOfDownloadableObjectsKey", std::int32_t{4}},
                               {"OVAContentCatalogPercentCompletedKey", std::uint32_t{25}}}));
  EXPECT_EQ(batch.array("OVMSObjectInfoArray")->kind(), Array::Kind::data);
}

TEST_F(DeviceNotificationsTest, TheReadyNoteCarriesThePreflightCount) {
  const auto client = add(11);
  counters.incrementPreflightObjectCount(12);
  const test::StandardErrorCapture log;
  notifications.sendDeviceIsReady();
  EXPECT_EQ(client->note(0), (Dictionary{{"type", "OVDeviceIsReady"},
                                         {"OVANumberOfPreflightObjectsKey", std::int32_t{12}},
                                         {"OVInternalDeviceUUID", "THE-UUID"}}));
  EXPECT_THAT(log.text(), HasSubstr("enumerateContent | OVDeviceIsReady: 12"));
}

TEST_F(DeviceNotificationsTest, EverySendIsLoggedWhenItsClassIsOn) {
  add(11);
  OVLoggingLevel = kLogTypeDetail;
  const test::StandardErrorCapture log;
  notifications.sendNotificationContentCatalogPercentCompleted();
  OVLoggingLevel = 0;
  EXPECT_THAT(log.text(), HasSubstr("sendNote | [00011] --> notifyContentCatalogPercentCompleted:"));
}

/// Replays of items with given names to one client.
class CatalogueReplayTest : public DeviceNotificationsTest {
 protected:
  std::vector<std::vector<std::string>> replayed(const std::vector<std::string>& names) {
    test::writeFile(card / "file", "");
    std::vector<std::shared_ptr<BrivoItem>> items;
    for (const std::string& name : names) {
      items.push_back(BrivoFile::initWithFSURL(card / "file", name, nullptr, *device));
    }
    CatalogueReplay replay(std::move(items), client);
    parts = 1;
    while (replay.sendSome(notifications)) ++parts;
    std::vector<std::vector<std::string>> batches;
    for (std::size_t i = 0; i < client->sent.size(); ++i) {
      batches.emplace_back();
      for (const Value& dataset : *client->note(i).array(keys::kObjectInfoArray)) {
        batches.back().push_back(MSObjectInfoDataset(*dataset.get<Data>()).filename());
      }
    }
    return batches;
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  std::shared_ptr<FakeConnection> client = std::make_shared<FakeConnection>(11);
  int parts = 0;
};

TEST_F(CatalogueReplayTest, AnEmptyIndexSendsOneBatchWithAnEmptyArray) {
  const auto other = add(12);
  EXPECT_THAT(replayed({}), ElementsAre(IsEmpty()));
  EXPECT_EQ(client->note(0).array(keys::kObjectInfoArray)->kind(), Array::Kind::data);
  EXPECT_THAT(other->sent, IsEmpty()) << "a replay is for one client alone";
}

TEST_F(CatalogueReplayTest, EachBatchHoldsOneDcfGroup) {
  EXPECT_THAT(replayed({"IMG_0001.JPG", "IMG_0001.CR2", "IMG_0002.JPG"}),
              ElementsAre(ElementsAre("IMG_0001.JPG", "IMG_0001.CR2"), ElementsAre("IMG_0002.JPG")));
}

TEST_F(CatalogueReplayTest, AnotherPrefixOrOtherDigitsStartAGroup) {
  EXPECT_THAT(replayed({"IMG_0001.JPG", "DSC_0001.JPG", "DSC_0001.NEF", "DSC_0002.JPG"}),
              ElementsAre(ElementsAre("IMG_0001.JPG"), ElementsAre("DSC_0001.JPG", "DSC_0001.NEF"),
                          ElementsAre("DSC_0002.JPG")));
}

TEST_F(CatalogueReplayTest, ANameWithoutAGroupTakesTheNextOneIn) {
  EXPECT_THAT(replayed({"A.B", "IMG_0001.JPG", "IMG_0002.JPG"}),
              ElementsAre(ElementsAre("A.B", "IMG_0001.JPG"), ElementsAre("IMG_0002.JPG")));
}

TEST_F(CatalogueReplayTest, AllItemsArriveOnceHoweverManyPartsThereAre) {
  std::vector<std::string> names;
  for (int i = 1; i <= 1000; ++i) names.push_back(fmt::format("IMG_{:04}.JPG", i));
  std::vector<std::string> arrived;
  for (const auto& batch : replayed(names)) arrived.insert(arrived.end(), batch.begin(), batch.end());
  EXPECT_EQ(arrived, names);
  EXPECT_GT(parts, 1);
}

}  // namespace
}  // namespace brivo
