// SPDX-License-Identifier: MIT
#include "device/clients/client_manager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "device/fake_connection.h"
#include "support/standard_error.h"
#include "util/log.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class Delegate : public OVClientManagerDelegate {
 public:
  void clientWentAway(std::int32_t pid) override { gone.push_back(pid); }
  void deviceIsServicingZeroClients() override { ++zeroClients; }

  std::vector<std::int32_t> gone;
  int zeroClients = 0;
};

class ClientManagerTest : public testing::Test {
 protected:
  ClientManagerTest() { manager->setDelegate(delegate); }

  std::shared_ptr<FakeConnection> add(std::int32_t pid) {
    auto connection = std::make_shared<FakeConnection>(pid);
    manager->addClientWithConnection(connection);
    return connection;
  }
  /// Runs what was put off.
  void runLater() {
    for (const Task& task : std::exchange(later, {})) task();
  }

  std::vector<Task> later;
  std::shared_ptr<Delegate> delegate = std::make_shared<Delegate>();
  std::shared_ptr<OVClientManager> manager =
      std::make_shared<OVClientManager>([this](Task task) { later.push_back(std::move(task)); });
};

TEST_F(ClientManagerTest, RemovingTheLastClientSchedulesZeroClientsOnceAndRemovingAnUnknownOneAgain) {
  add(11);
  add(12);
  EXPECT_EQ(manager->removeClientWithPID(11), 1u);
  runLater();
  EXPECT_EQ(delegate->zeroClients, 0);
  EXPECT_EQ(manager->removeClientWithPID(12), 0u);
  EXPECT_EQ(delegate->zeroClients, 0) << "not synchronously";
  runLater();
  EXPECT_EQ(delegate->zeroClients, 1);
  EXPECT_EQ(manager->removeClientWithPID(99), 0u);
  runLater();
  EXPECT_EQ(delegate->zeroClients, 2);
  EXPECT_THAT(delegate->gone, ElementsAre(11, 12));
}

TEST_F(ClientManagerTest, ATypeRegisteredTwiceAndRemovedOnceIsNoInterestAnyMore) {
  const auto connection = add(11);
  manager->addNotifications({"a", "b"}, 11);
  manager->addNotifications({"a"}, 11);
  EXPECT_THAT(manager->clientConnectionsMonitoringNotification("a"), ElementsAre(connection));
  manager->remNotifications({"a"}, 11);
  EXPECT_THAT(manager->clientConnectionsMonitoringNotification("a"), IsEmpty());
  EXPECT_THAT(manager->clientConnectionsMonitoringNotification("b"), ElementsAre(connection));
}

TEST_F(ClientManagerTest, InterestedClientsComeInTheOrderOfTheRegistry) {
  const auto first = add(11);
  const auto second = add(12);
  const auto third = add(13);
  manager->addNotifications({"a"}, 13);
  manager->addNotifications({"a"}, 11);
  EXPECT_THAT(manager->clientConnectionsMonitoringNotification("a"), ElementsAre(first, third));
  EXPECT_THAT(manager->allClientConnections(), ElementsAre(first, second, third));
}

TEST_F(ClientManagerTest, ClientUsingDeviceOnAnEmptyRegistryIsMinus1) {
  EXPECT_EQ(manager->clientUsingDevice(), -1);
  add(11);
  EXPECT_EQ(manager->clientUsingDevice(), -1);
  add(12);
  manager->setClientUsingDevice(12, true);
  EXPECT_EQ(manager->clientUsingDevice(), 12);
  manager->setClientUsingDevice(12, false);
  EXPECT_EQ(manager->clientUsingDevice(), -1);
}

TEST_F(ClientManagerTest, SetClientUsingDeviceWithProcess0DoesNothing) {
  add(0);
  manager->setClientUsingDevice(0, true);
  EXPECT_EQ(manager->clientUsingDevice(), -1);
}

TEST_F(ClientManagerTest, ObjectHandlesAreMatchedAsSignedNumbers) {
  const auto connection = add(11);
  manager->setClientUsingObjectHandle(11, 7);
  EXPECT_THAT(manager->clientConnectionsMonitoringObjectID(7), ElementsAre(connection));
  EXPECT_THAT(manager->clientConnectionsMonitoringObjectID(8), IsEmpty());
  manager->setClientUsingObjectHandle(11, 2'147'483'647);
  EXPECT_THAT(manager->clientConnectionsMonitoringObjectID(2'147'483'647), ElementsAre(connection));
}

TEST_F(ClientManagerTest, AnObjectHandleOf2147483648FindsNoClient) {
  add(11);
  manager->setClientUsingObjectHandle(11, 2'147'483'648);
  EXPECT_THAT(manager->clientConnectionsMonitoringObjectID(2'147'483'648), IsEmpty());
}

TEST_F(ClientManagerTest, ASecondConnectionOfAProcessIsNotAddedAndGetsNoHandlers) {
  const auto first = add(11);
  const test::StandardErrorCapture log;
  const auto second = add(11);
  EXPECT_EQ(manager->currentClientCount(), 1u);
  EXPECT_TRUE(first->interruptionHandler);
  EXPECT_FALSE(second->interruptionHandler);
  EXPECT_FALSE(second->invalidationHandler);
  EXPECT_THAT(log.text(), HasSubstr("                  CM | [00011] Client already exists?\n"));
  EXPECT_THAT(log.text(), HasSubstr("                  CM | [00001] Client count\n"));
}

TEST_F(ClientManagerTest, NoConnectionIsNoClient) {
  manager->addClientWithConnection(nullptr);
  EXPECT_EQ(manager->currentClientCount(), 0u);
}

TEST_F(ClientManagerTest, AClientGoesWithItsConnectionAndTakesItAlong) {
  for (Task FakeConnection::*handler :
       {&FakeConnection::interruptionHandler, &FakeConnection::invalidationHandler}) {
    const auto connection = add(11);
    const test::StandardErrorCapture log;
    (*connection.*handler)();
    EXPECT_EQ(manager->currentClientCount(), 0u);
    EXPECT_EQ(connection->invalidated, 1);
    EXPECT_THAT(log.text(), HasSubstr("CM | [11] Terminated ZEPH connection!"));
    EXPECT_THAT(log.text(), HasSubstr("client manager | [00011] Removing Client"));
  }
}

TEST_F(ClientManagerTest, AnEndAfterTheRegistryHasGoneIsHarmless) {
  const auto connection = add(11);
  manager.reset();
  connection->interruptionHandler();
}

TEST_F(ClientManagerTest, UnknownProcessesAreNoError) {
  manager->addNotifications({"a"}, 99);
  manager->remNotifications({"a"}, 99);
  manager->setClientUsingDevice(99, true);
  manager->setClientUsingObjectHandle(99, 1);
  manager->sendMessage("x", 99);
  EXPECT_EQ(manager->findClientWithPID(99), nullptr);
}

TEST_F(ClientManagerTest, InterestsAreLoggedWithTheirProcess) {
  add(11);
  const test::StandardErrorCapture log;
  manager->addNotifications({"a", "b"}, 11);
  manager->remNotifications({"b"}, 11);
  EXPECT_THAT(log.text(), HasSubstr("adding | [00011] - (a, b)"));
  EXPECT_THAT(log.text(), HasSubstr("removing | [00011] - (b)"));
}

TEST_F(ClientManagerTest, VerboseLinesSayWhatIsLookedFor) {
  add(11);
  OVLoggingLevel = kLogTypeDetail;
  const test::StandardErrorCapture log;
  (void)manager->clientConnectionsMonitoringNotification("note");
  (void)manager->clientConnectionsMonitoringObjectID(255);
  (void)manager->allClientConnections();
  OVLoggingLevel = 0;
  EXPECT_THAT(log.text(), HasSubstr("noteInterest | [00001] - note"));
  EXPECT_THAT(log.text(), HasSubstr("noteInterest | [00001] - 0x000000FF"));
  EXPECT_THAT(log.text(), HasSubstr("noteInterest | [00001] - All Clients"));
}

TEST_F(ClientManagerTest, ClientsComeAndGoOnManyThreads) {
  const auto manyTimes = [&](std::int32_t pid) {
    for (int i = 0; i < 200; ++i) {
      manager->addClientWithConnection(std::make_shared<FakeConnection>(pid));
      manager->addNotifications({"a"}, pid);
      (void)manager->clientConnectionsMonitoringNotification("a");
      (void)manager->clientUsingDevice();
    }
  };
  std::thread first(manyTimes, 1);
  std::thread second(manyTimes, 2);
  first.join();
  second.join();
  EXPECT_EQ(manager->currentClientCount(), 2u);
}

TEST(ClientTest, WithoutAConnectionItsProcessIsMinus1) {
  const OVClient client(nullptr);
  EXPECT_EQ(client.pid(), -1);
  EXPECT_FALSE(client.openSession());
  EXPECT_FALSE(client.forwardPTPEvents());
  EXPECT_EQ(client.objectHandle(), 0u);
}

}  // namespace
}  // namespace brivo
