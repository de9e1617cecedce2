// SPDX-License-Identifier: MIT
#include "device/content_enumeration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

#include "content/recording_device.h"
#include "device/fake_connection.h"
#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class Host : public ContentEnumeration::Host {
 public:
  std::optional<ContentEnumeration::Store> store() const override { return theStore; }
  void replayContents(const std::shared_ptr<zeph::Connection>& connection) override {
    replays.push_back(connection->processIdentifier());
  }

  std::optional<ContentEnumeration::Store> theStore;
  std::vector<std::int32_t> replays;
};

/// A file system in which looking at one folder waits until it is let go.
class HaltingFileSystem : public FileSystem {
 public:
  Result<ResourceValues> resourceValues(const std::string& path) override {
    return systemFiles().resourceValues(path);
  }
  Result<std::vector<std::string>> names(const std::string& path) override {
    reached.set_value();
    letGo.get_future().wait();
    return systemFiles().names(path);
  }
  Result<std::vector<DirectoryEntry>> entries(const std::string& path) override {
    return systemFiles().entries(path);
  }
  Result<UniqueFd> open(const std::string& path) override { return systemFiles().open(path); }
  std::int64_t read(int fd, std::span<std::byte> buffer, std::uint64_t offset) override {
    return systemFiles().read(fd, buffer, offset);
  }
  std::optional<SystemError> remove(const std::string& path) override { return systemFiles().remove(path); }

  std::promise<void> reached;
  std::promise<void> letGo;
};

class ContentEnumerationTest : public testing::Test {
 protected:
  ContentEnumerationTest() { clients->addClientWithConnection(client); }

  void use(std::vector<std::string> mediaPaths) {
    host.theStore = {{"CARD", card.path(), std::move(mediaPaths)}};
  }
  int enumerate(const Dictionary& options = {}) {
    int done = 0;
    enumeration.enumerateContentWithOptions(options, client, [&] { ++done; });
    device->run();
    return done;
  }
  /// The selectors that the client heard, in order.
  std::vector<std::string> heard() {
    std::vector<std::string> names;
    for (const auto& [selector, arguments] : client->sent) names.push_back(selector);
    return names;
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
  Host host;
  CatalogueCounters counters;
  ObjectIndex index{counters};
  std::shared_ptr<FakeConnection> client = std::make_shared<FakeConnection>(11);
  std::shared_ptr<OVClientManager> clients = std::make_shared<OVClientManager>([](const Task&) {});
  DeviceNotifications notifications{*clients, counters, [] { return "UUID"; }};
  ContentEnumeration enumeration{*device, host, index, counters, notifications};
};

TEST_F(ContentEnumerationTest, WithoutAValidDcfFolderTheCountIsTheNumberOfMediaPaths) {
  test::makeFolder(card / "DCIM/MISC");
  test::makeFolder(card / "MP_ROOT");
  use({"DCIM", "MP_ROOT"});
  EXPECT_EQ(enumerate(), 1);
  EXPECT_EQ(counters.preflightCount(), 2);
  ASSERT_EQ(client->sent[0].first, selectors::kPostNotification) << "the ready note is still sent";
  EXPECT_EQ(client->note(0).signedInteger(keys::kNumberOfPreflightObjects), 2);
}

TEST_F(ContentEnumerationTest, PreflightCountsMediaFoldersDcfFoldersAndTheirDcfFiles) {
  for (const char* name :
       {"100ABCDE/IMG_0001.JPG", "100ABCDE/IMG_0001.CR2", "100ABCDE/notes.txt", "101ABCDE/IMG_0001.JPG",
        "MISC/IMG_0001.JPG", "IMG_0001.JPG", "100ABCDE/102ABCDE/IMG_0009.JPG"}) {
    test::writeFile(card / ("DCIM/" + std::string(name)), "");
  }
  use({"DCIM"});
  const test::StandardErrorCapture log;
  enumerate();
  EXPECT_EQ(counters.preflightCount(), 1 + 2 + 3);
  EXPECT_THAT(log.text(), HasSubstr("CARD | 🗄 Store Added  - 0001 - [    DCIM]"));
  EXPECT_THAT(log.text(), HasSubstr("CARD | 🗂 Folder Added - 0001 - [100ABCDE]"));
  EXPECT_THAT(log.text(), HasSubstr("CARD | 🗳 Files Added  - 0002"));
  EXPECT_THAT(log.text(), HasSubstr("CARD | 🗳 Files Added  - 0001"));
}

TEST_F(ContentEnumerationTest, NamesThatFailTheCheckAreLoggedNotCountedAndNotDescendedInto) {
  test::writeFile(card / "DCIM/MISC/IMG_0001.JPG", "");
  test::writeFile(card / "DCIM/100ABCDE/notes.txt", "");
  use({"DCIM"});
  const test::StandardErrorCapture log;
  enumerate();
  EXPECT_EQ(counters.preflightCount(), 2);
  EXPECT_THAT(log.text(), HasSubstr("CARD | !DCF Folder: [            MISC]"));
  EXPECT_THAT(log.text(), HasSubstr("CARD | !DCF File: [       notes.txt]"));
}

TEST_F(ContentEnumerationTest, TheFirstTimeSaysReadyThenTheFolderThenThePercentage) {
  test::writeFile(card / "DCIM/100ABCDE/IMG_0001.JPG", "");
  use({"DCIM"});
  EXPECT_EQ(enumerate(), 1);
  // The folder's batches go through the device, which here only keeps them.
  EXPECT_THAT(heard(), ElementsAre(selectors::kPostNotification, selectors::kNotifyPercentCompleted));
  EXPECT_THAT(device->batchNames(),
              ElementsAre(ElementsAre("DCIM"), ElementsAre("100ABCDE"), ElementsAre("IMG_0001.JPG")));
  EXPECT_EQ(index.copyIndexedFoldersAndFiles().size(), 1u);
}

TEST_F(ContentEnumerationTest, DuringTheFirstEnumeration0PercentIsReportedAndLater100) {
  test::writeFile(card / "DCIM/100ABCDE/IMG_0001.JPG", "");
  use({"DCIM"});
  enumerate();
  EXPECT_EQ(counters.msObjectCount(), 0);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 0u);
  counters.updateEnumeratedItemCountWithDelta(1);  // what the walk's file would have added to the index
  enumerate();
  EXPECT_EQ(counters.msObjectCount(), 1);
  EXPECT_THAT(*client->sent.back().second, ElementsAre(Value(std::uint32_t{100})));
}

TEST_F(ContentEnumerationTest, ALaterCallReplaysToItsCallerAndDoesNotWalkAgain) {
  test::makeFolder(card / "DCIM");
  use({"DCIM"});
  enumerate();
  client->sent.clear();
  device->batches.clear();
  const auto late = std::make_shared<FakeConnection>(12);
  const test::StandardErrorCapture log;
  int done = 0;
  enumeration.enumerateContentWithOptions({}, late, [&] { ++done; });
  EXPECT_EQ(done, 1);
  EXPECT_THAT(host.replays, ElementsAre(12));
  EXPECT_THAT(device->steps, IsEmpty());
  EXPECT_THAT(device->batches, IsEmpty());
  EXPECT_EQ(counters.preflightCount(), 1) << "not counted again";
  EXPECT_THAT(heard(), ElementsAre(selectors::kPostNotification, selectors::kNotifyPercentCompleted));
  EXPECT_THAT(log.text(), HasSubstr("enumerateContent | Requested From:12"));
}

TEST_F(ContentEnumerationTest, PrioritizeSpeedIsNeverTakenBack) {
  use({});
  EXPECT_FALSE(enumeration.prioritizeSpeed());
  enumerate({{"OVEnumerationPrioritizeSpeed", true}});
  EXPECT_TRUE(enumeration.prioritizeSpeed());
  enumerate({{"OVEnumerationPrioritizeSpeed", false}});
  enumerate();
  EXPECT_TRUE(enumeration.prioritizeSpeed());
}

TEST_F(ContentEnumerationTest, AMissingMediaFolderIsCountedButNotWalked) {
  use({"DCIM"});
  EXPECT_EQ(enumerate(), 1);
  EXPECT_EQ(counters.preflightCount(), 1);
  EXPECT_THAT(device->batches, IsEmpty());
}

TEST_F(ContentEnumerationTest, ACallBeforeAnybodyUsesTheDeviceDoesNotSpoilTheFirstRealOne) {
  test::makeFolder(card / "DCIM");
  EXPECT_EQ(enumerate(), 1);
  EXPECT_EQ(client->note(0).signedInteger(keys::kNumberOfPreflightObjects), 0);
  use({"DCIM"});
  enumerate();
  EXPECT_THAT(host.replays, IsEmpty());
  EXPECT_THAT(device->batchNames(), ElementsAre(ElementsAre("DCIM")));
}

TEST_F(ContentEnumerationTest, TwoFirstCallsAtOnceWalkTheCardOnce) {
  test::makeFolder(card / "DCIM");
  use({"DCIM"});
  HaltingFileSystem files;
  device->fileSystem = &files;
  std::atomic<int> done = 0;
  std::thread first([&] { enumeration.enumerateContentWithOptions({}, client, [&] { ++done; }); });
  files.reached.get_future().wait();  // the first is counting
  const auto late = std::make_shared<FakeConnection>(12);
  enumeration.enumerateContentWithOptions({}, late, [&] { ++done; });
  EXPECT_EQ(done, 0) << "the second waits for the first";
  EXPECT_THAT(host.replays, IsEmpty());
  files.letGo.set_value();
  first.join();
  EXPECT_EQ(done, 2);
  EXPECT_THAT(host.replays, ElementsAre(12)) << "and is a later client then";
  EXPECT_EQ(counters.preflightCount(), 1);
  EXPECT_THAT(device->batchNames(), ElementsAre(ElementsAre("DCIM")));
}

}  // namespace
}  // namespace brivo
