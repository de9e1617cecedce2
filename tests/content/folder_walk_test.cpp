// SPDX-License-Identifier: MIT
#include "content/folder_walk.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "content/grouping.h"
#include "content/recording_device.h"
#include "protocol/keys.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/log.h"

namespace brivo {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::UnorderedElementsAre;

class FolderWalkTest : public testing::Test {
 protected:
  FolderWalkTest() { OVLoggingLevel = kLogTypeContent; }
  ~FolderWalkTest() override { OVLoggingLevel = 0; }

  /// Writes a file with a modification time, in seconds.
  void add(const std::string& path, std::int64_t modified = 1'000'000) {
    test::writeFile(card / path, "x");
    const timespec times[2] = {{modified, 0}, {modified, 0}};
    ASSERT_EQ(::utimensat(AT_FDCWD, (card / path).c_str(), times, 0), 0);
  }
  void walk(const std::string& path, const std::string& name, const Dictionary& options = {}) {
    const auto folder = BrivoFolder::initWithFSURL(card / path, name, nullptr, *device);
    ASSERT_TRUE(folder);
    folder->enumerateContentWithOptions(options);
    device->run();
  }
  std::vector<std::string> folderNames() const {
    std::vector<std::string> names;
    for (const auto& folder : device->folders) names.push_back(folder->name());
    return names;
  }
  std::vector<std::string> fileNames() const {
    std::vector<std::string> names;
    for (const auto& file : device->files_) names.push_back(file->name());
    return names;
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
};

TEST_F(FolderWalkTest, InDcimOnlyDcfFoldersAreTakenAndTheRestIsDumped) {
  test::makeFolder(card / "DCIM/100ABCDE");
  test::makeFolder(card / "DCIM/099ABCDE");
  test::makeFolder(card / "DCIM/ABCDEFGH");
  add("DCIM/README.TXT");
  const test::StandardErrorCapture log;
  walk("DCIM", "DCIM");
  EXPECT_THAT(folderNames(), ElementsAre("100ABCDE"));
  EXPECT_THAT(fileNames(), IsEmpty());
  for (const char* dumped : {"[          099ABCDE]", "[          ABCDEFGH]", "[        README.TXT]"}) {
    EXPECT_THAT(log.text(),
                HasSubstr(std::string("Dumped: ") + dumped + " - DCIM can only contain subdirectories"));
  }
  EXPECT_THAT(log.text(), HasSubstr("DCIM | [00003] Non-compliant DCF objects"));
}

TEST_F(FolderWalkTest, OnlyAFolderNamedExactlyDcimOrMpRootIsAMediaRoot) {
  EXPECT_TRUE(BrivoFolder::initWithFSURL(card.path(), "DCIM", nullptr, *device)->isMediaRoot());
  EXPECT_TRUE(BrivoFolder::initWithFSURL(card.path(), "MP_ROOT", nullptr, *device)->isMediaRoot());
  EXPECT_FALSE(BrivoFolder::initWithFSURL(card.path(), "dcim", nullptr, *device)->isMediaRoot());
  test::makeFolder(card / "DCIM/dcim/100ABCDE");
  add("DCIM/dcim/IMG_0001.JPG");
  walk("DCIM", "DCIM");
  EXPECT_THAT(folderNames(), ElementsAre("dcim")) << "it passes the folder expression";
  EXPECT_THAT(fileNames(), ElementsAre("IMG_0001.JPG")) << "and holds files as any DCF folder";
}

TEST_F(FolderWalkTest, InADcfFolderOnlyDcfFilesAreTaken) {
  add("100ABCDE/img_0001.jpg");
  add("100ABCDE/IMG_0001.JPEG");
  add("100ABCDE/IMG_E0001.HEIC");
  test::makeFolder(card / "100ABCDE/101ABCDE");
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(fileNames(), UnorderedElementsAre("img_0001.jpg", "IMG_E0001.HEIC"));
  EXPECT_THAT(folderNames(), IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("Dumped: [     IMG_0001.JPEG] - SUBDIR can only contain images"));
  EXPECT_THAT(log.text(), HasSubstr("Dumped: [          101ABCDE] - SUBDIR can only contain images"));
}

TEST_F(FolderWalkTest, TheFilesOfOneShotTravelTogether) {
  add("100ABCDE/IMG_0001.JPG", 100);
  add("100ABCDE/IMG_0002.JPG", 200);
  add("100ABCDE/IMG_0001.CR2", 300);
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(device->batchNames(),
              ElementsAre(ElementsAre("IMG_0001.JPG", "IMG_0001.CR2"), ElementsAre("IMG_0002.JPG")));
}

TEST_F(FolderWalkTest, AFolderOfDumpedEntriesSendsNoBatchAndLogsTheCountInFiveDigits) {
  for (const char* name : {"a.txt", "b.txt", "c.txt"}) add(std::string("100ABCDE/") + name);
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(device->batches, IsEmpty());
  EXPECT_THAT(log.text(), HasSubstr("100ABCDE | [00003] Non-compliant DCF objects\n"));
}

TEST_F(FolderWalkTest, SubFoldersAreIndexedAnnouncedAloneAndWalked) {
  add("DCIM/100ABCDE/IMG_0001.JPG");
  add("DCIM/101ABCDE/IMG_0001.JPG");
  walk("DCIM", "DCIM");
  EXPECT_THAT(folderNames(), UnorderedElementsAre("100ABCDE", "101ABCDE"));
  EXPECT_THAT(device->files_, testing::SizeIs(2));
  EXPECT_THAT(device->batchNames(), Contains(ElementsAre("100ABCDE")));
  for (const auto& file : device->files_) {
    const bool inOneOfThem = file->parentObject() == device->folders[0]->objHandle() ||
                             file->parentObject() == device->folders[1]->objHandle();
    EXPECT_TRUE(inOneOfThem);
  }
}

TEST_F(FolderWalkTest, LongNamesAreCutInDumpLines) {
  add("100ABCDE/abcdefghijklmnopqr");   // 18 characters
  add("100ABCDE/abcdefghijklmnopqrs");  // 19
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(log.text(), HasSubstr("Dumped: [abcdefghijklmnopqr] - "));
  EXPECT_THAT(log.text(), HasSubstr("Dumped: [ abcdefghijklmnopq] - "));
}

TEST_F(FolderWalkTest, DumpLinesAreDebugLinesWhileTheirClassIsOff) {
  OVLoggingLevel = 0;
  add("100ABCDE/a.txt");
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(log.text(), Not(HasSubstr("Dumped")));
  EXPECT_THAT(log.text(), HasSubstr("[00001] Non-compliant DCF objects"));
  EXPECT_THAT(log.text(), HasSubstr("100ABCDE | --> Entering Enumeration"));
  EXPECT_THAT(log.text(), HasSubstr("100ABCDE | Total Enumeration Time   ["));
}

TEST_F(FolderWalkTest, HiddenEntriesAreNotEvenDumped) {
  add("100ABCDE/.IMG_0001.JPG");
  add("100ABCDE/._IMG_0001.JPG");
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(log.text(), Not(HasSubstr("Non-compliant")));
}

TEST_F(FolderWalkTest, OddNamesAreDumpedOnOneLineEach) {
  add("100ABCDE/\xFF\xFE");
  add("100ABCDE/a\nb");
  const test::StandardErrorCapture log;
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(log.text(), HasSubstr("[                \xEF\xBF\xBD\xEF\xBF\xBD]"));
  EXPECT_THAT(log.text(), HasSubstr("a\\x0ab]"));
}

TEST_F(FolderWalkTest, LinksAndFifosNamedLikePicturesAreNoItems) {
  test::writeFile(card / "secret", "host");
  test::makeFolder(card / "100ABCDE");
  ASSERT_EQ(::symlink((card / "secret").c_str(), (card / "100ABCDE/IMG_0001.JPG").c_str()), 0);
  ASSERT_EQ(::mkfifo((card / "100ABCDE/IMG_0002.JPG").c_str(), 0600), 0);
  ASSERT_EQ(::symlink((card / "100ABCDE").c_str(), (card / "101ABCDE").c_str()), 0);
  walk("100ABCDE", "100ABCDE");
  EXPECT_THAT(device->files_, IsEmpty());
  EXPECT_THAT(device->batches, IsEmpty());
  const auto linked = BrivoFolder::initWithFSURL(card / "101ABCDE", "101ABCDE", nullptr, *device);
  EXPECT_EQ(linked, nullptr);
}

TEST_F(FolderWalkTest, AFolderThatVanishedEndsTheWalk) {
  test::makeFolder(card / "100ABCDE");
  const auto folder = BrivoFolder::initWithFSURL(card / "100ABCDE", "100ABCDE", nullptr, *device);
  ASSERT_EQ(::rmdir((card / "100ABCDE").c_str()), 0);
  folder->enumerateContentWithOptions({});
  device->run();
  EXPECT_THAT(device->batches, IsEmpty());
}

TEST_F(FolderWalkTest, AWalkEndsWithItsDevice) {
  for (int i = 0; i < 500; ++i) add("100ABCDE/IMG_" + std::to_string(1000 + i) + ".JPG");
  const auto folder = BrivoFolder::initWithFSURL(card / "100ABCDE", "100ABCDE", nullptr, *device);
  folder->enumerateContentWithOptions({});
  Task step = std::move(device->steps.front());
  device->steps.clear();
  step();  // the first part
  ASSERT_EQ(device->steps.size(), 1u);
  step = std::move(device->steps.front());
  const std::weak_ptr<RecordingDevice> weak = device;
  device.reset();
  EXPECT_TRUE(weak.expired()) << "a walk that waits does not keep its device";
  step();
}

TEST_F(FolderWalkTest, LargeFoldersAreWalkedInSteps) {
  for (int i = 0; i < 200; ++i) add("100ABCDE/IMG_" + std::to_string(1000 + i) + ".JPG");
  walk("100ABCDE", "100ABCDE");
  EXPECT_EQ(device->batches.size(), 200u);
  EXPECT_EQ(device->files_.size(), 200u);
}

std::vector<std::string> sorted(std::int64_t order) {
  const auto entry = [](const char* name, std::int64_t seconds) {
    DirectoryEntry made{name, true, {}};
    made.values.modified = {seconds, 0};
    return made;
  };
  std::vector<DirectoryEntry> entries{entry("b", 2), entry("a", 3), entry("d", 1), entry("c", 2)};
  sortEntries(entries, order);
  std::vector<std::string> names;
  for (const auto& one : entries) names.push_back(one.name);
  return names;
}

TEST(SortEntriesTest, TheOptionChoosesOldestFirstNewestFirstOrByName) {
  EXPECT_THAT(sorted(-1), ElementsAre("d", "b", "c", "a"));
  EXPECT_THAT(sorted(1), ElementsAre("a", "b", "c", "d"));
  EXPECT_THAT(sorted(0), ElementsAre("a", "b", "c", "d"));
}

TEST_F(FolderWalkTest, TheOrderOptionArrivesAndGoesOnToSubFolders) {
  add("DCIM/100ABCDE/IMG_0001.JPG", 100);
  add("DCIM/100ABCDE/IMG_0002.JPG", 200);
  walk("DCIM", "DCIM", {{std::string(keys::kEnumerationChronologicalOrder), 1}});
  EXPECT_THAT(fileNames(), ElementsAre("IMG_0002.JPG", "IMG_0001.JPG"));
}

TEST_F(FolderWalkTest, NewItemWithNotifySendsTheFoldersOwnDataset) {
  add("100ABCDE/IMG_0001.JPG");
  const auto folder = BrivoFolder::initWithFSURL(card / "100ABCDE", "100ABCDE", nullptr, *device);
  ASSERT_TRUE(folder->newItemWithFSURL(card / "100ABCDE/IMG_0001.JPG", "IMG_0001.JPG", true));
  EXPECT_THAT(device->batchNames(), ElementsAre(ElementsAre("100ABCDE")));
  EXPECT_EQ(folder->newItemWithFSURL(card / "100ABCDE/none", "none", true), nullptr);
  EXPECT_EQ(device->batches.size(), 1u);
}

TEST_F(FolderWalkTest, OnlyTheLastComponentOfAPathIsComparedWithTheFoldersName) {
  const auto folder = BrivoFolder::initWithFSURL(card.path(), "100ABCDE", nullptr, *device);
  EXPECT_EQ(folder->folderMatchingPath("/anything/at/all/100ABCDE"), folder);
  EXPECT_EQ(folder->folderMatchingPath("100ABCDE"), folder);
  EXPECT_EQ(folder->folderMatchingPath("/100ABCDE/IMG_0001.JPG"), nullptr);
}

TEST(GroupingTest, GroupsInTheOrderOfFirstAppearanceAndSkipsWhatHasNoKey) {
  const auto groups = copyGroupIntoDictionary(std::vector<int>{5, 12, 7, 15, 22, 2}, [](int number) {
    return number == 7 ? std::nullopt : std::optional<int>(number % 10);
  });
  EXPECT_THAT(groups, ElementsAre(ElementsAre(5, 15), ElementsAre(12, 22, 2)));
}

}  // namespace
}  // namespace brivo
