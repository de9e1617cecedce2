// SPDX-License-Identifier: MIT
#include "platform/volumes/volume_monitor.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <mutex>
#include <set>

#include "platform/volumes/volume_scan.h"
#include "platform/volumes/volume_statistics.h"
#include "support/mounts.h"
#include "support/raw_dbus.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using test::makeFolder;
using test::TemporaryFolder;
using test::waitUntil;
using testing::ElementsAre;
using testing::IsEmpty;
using Paths = std::set<std::string>;

/// Runs a monitor and keeps what it reported: the paths of all domains that hold photos, report by report.
class VolumeMonitorTest : public testing::Test {
 protected:
  ~VolumeMonitorTest() override {
    if (token) monitor->endMonitoring(token);
  }

  void begin(const std::vector<std::string>& roots, const std::vector<std::string>& folders) {
    monitor = std::make_unique<VolumeMonitor>(pool, roots, folders);
    token = monitor->beginMonitoring([this](const DomainReport& report) {
      ASSERT_TRUE(report.ok()) << report.error().text();
      Paths paths;
      for (const auto& [identifier, domain] : *report) {
        for (const Url& url : domain.storageURLs) {
          if (domain.containsPhotos) paths.insert(url.path());
        }
      }
      const std::lock_guard lock(mutex);
      reports.push_back(std::move(paths));
    });
    ASSERT_TRUE(token);
  }

  Paths current() {
    const std::lock_guard lock(mutex);
    return reports.empty() ? Paths() : reports.back();
  }
  bool becomes(const Paths& expected) {
    return waitUntil([&] { return current() == expected; });
  }
  std::vector<Paths> allReports() {
    const std::lock_guard lock(mutex);
    return reports;
  }

  const bool mayMount = test::enterMountNamespace();  // before the first thread
  TemporaryFolder folder;
  Pool pool;
  std::mutex mutex;
  std::vector<Paths> reports;
  std::unique_ptr<VolumeMonitor> monitor;
  DomainMonitor::Token token;
};

TEST_F(VolumeMonitorTest, FoldersThatAreThereAreReportedBeforeBeginReturns) {
  makeFolder(folder / "CARD/DCIM");
  makeFolder(folder / "other/misc");
  makeFolder(folder / "lower/mp_root");
  begin({}, {folder.path()});
  EXPECT_EQ(current(), (Paths{folder / "CARD", folder / "lower"}));
}

TEST_F(VolumeMonitorTest, AFolderThatComesAndGoesIsReported) {
  begin({}, {folder.path()});
  makeFolder(folder / "CARD/DCIM/100ABCDE");
  EXPECT_TRUE(becomes({folder / "CARD"}));
  std::filesystem::remove_all(folder / "CARD");
  EXPECT_TRUE(becomes({}));
}

TEST_F(VolumeMonitorTest, ADcimMadeLaterMakesTheFolderAVolumeAndItsEndEndsIt) {
  makeFolder(folder / "CARD");
  begin({}, {folder.path()});
  EXPECT_THAT(current(), IsEmpty());
  makeFolder(folder / "CARD/dcim");
  EXPECT_TRUE(becomes({folder / "CARD"}));
  std::filesystem::remove(folder / "CARD/dcim");
  EXPECT_TRUE(becomes({}));
}

TEST_F(VolumeMonitorTest, AFolderMovedInIsSeenAndOneMovedOutIsGone) {
  const TemporaryFolder elsewhere;
  makeFolder(elsewhere / "CARD/DCIM");
  begin({}, {folder.path()});
  std::filesystem::rename(elsewhere / "CARD", folder / "CARD");
  EXPECT_TRUE(becomes({folder / "CARD"}));
  std::filesystem::rename(folder / "CARD", elsewhere / "CARD");
  EXPECT_TRUE(becomes({}));
}

TEST_F(VolumeMonitorTest, AFolderThatWasReplacedGoesAndComes) {
  makeFolder(folder / "CARD/DCIM");
  begin({}, {folder.path()});
  std::filesystem::remove_all(folder / "CARD");
  makeFolder(folder / "CARD/DCIM");
  ASSERT_TRUE(waitUntil([&] { return allReports().size() >= 3; }));
  EXPECT_THAT(allReports(), ElementsAre(Paths{folder / "CARD"}, Paths{}, Paths{folder / "CARD"}));
}

TEST_F(VolumeMonitorTest, TheBaseFolderMayBeMadeLaterAndBeReplaced) {
  const std::string base = folder / "volumes";
  begin({}, {base});
  makeFolder(base + "/A/DCIM");
  EXPECT_TRUE(becomes({base + "/A"}));
  std::filesystem::rename(base, folder / "old");
  EXPECT_TRUE(becomes({}));
  makeFolder(base + "/B/DCIM");
  EXPECT_TRUE(becomes({base + "/B"}));
}

TEST_F(VolumeMonitorTest, FilesAndSymbolicLinksAreNoVolumes) {
  const TemporaryFolder elsewhere;
  makeFolder(elsewhere / "DCIM");
  ASSERT_EQ(::symlink(elsewhere.path().c_str(), (folder / "link").c_str()), 0);
  test::writeFile(folder / "file", "");
  makeFolder(folder / "linked-dcim");
  ASSERT_EQ(::symlink((elsewhere / "DCIM").c_str(), (folder / "linked-dcim/DCIM").c_str()), 0);
  makeFolder(folder / ".hidden/DCIM");
  begin({}, {folder.path()});
  EXPECT_THAT(current(), IsEmpty());
}

TEST_F(VolumeMonitorTest, VolumesThatVanishTogetherAreChangesOfTheirOwn) {
  makeFolder(folder / "A/DCIM");
  makeFolder(folder / "B/DCIM");
  const TemporaryFolder elsewhere;
  begin({}, {folder.path()});
  std::filesystem::rename(folder / "A", elsewhere / "A");
  std::filesystem::rename(folder / "B", elsewhere / "B");
  ASSERT_TRUE(becomes({}));
  const auto all = allReports();
  ASSERT_GE(all.size(), 3u);
  EXPECT_EQ(all[all.size() - 3], (Paths{folder / "A", folder / "B"}));
  EXPECT_EQ(all[all.size() - 2], Paths{folder / "B"});
}

TEST_F(VolumeMonitorTest, ThousandsOfEventsEndInTheRightSet) {
  begin({}, {folder.path()});
  for (int i = 0; i < 20'000; ++i) {
    const std::string name = folder / ("f" + std::to_string(i));
    UniqueFd(::open(name.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0600));
  }
  makeFolder(folder / "CARD/DCIM");
  EXPECT_TRUE(becomes({folder / "CARD"}));
}

TEST_F(VolumeMonitorTest, EndingLeavesNoDescriptorAndNoThread) {
  makeFolder(folder / "CARD/DCIM");
  const std::size_t before = test::openDescriptorCount();
  begin({}, {folder.path()});
  monitor->endMonitoring(token);
  token.reset();
  EXPECT_EQ(test::openDescriptorCount(), before);
}

// ---------------------------------------------------------------------------------------------- real mounts

class MountedVolumeTest : public VolumeMonitorTest {
 protected:
  void SetUp() override {
    if (!mayMount) GTEST_SKIP() << "mounting needs root";
  }
};

TEST_F(MountedVolumeTest, AMountedCardComesAndGoes) {
  begin({folder.path()}, {});
  test::LoopMount card(folder / "CARD");
  makeFolder(folder / "CARD/DCIM");
  EXPECT_TRUE(becomes({folder / "CARD"}));
  EXPECT_TRUE(card.unmount()) << "an idle volume must unmount cleanly";
  EXPECT_TRUE(becomes({}));
}

TEST_F(MountedVolumeTest, ANameWithBlanksAndControlCharactersIsFound) {
  begin({folder.path()}, {});
  const std::string point = folder / "EOS DIGITAL\n2";
  makeFolder(point);
  const test::LoopMount card(folder / "plain");
  makeFolder(folder / "plain/DCIM");
  ASSERT_TRUE(becomes({folder / "plain"}));
  ASSERT_EQ(::mount((folder / "plain").c_str(), point.c_str(), nullptr, MS_MOVE, nullptr), 0);
  EXPECT_TRUE(becomes({point}));
  ::umount2(point.c_str(), MNT_DETACH);
}

TEST_F(MountedVolumeTest, ACardExchangedAtOnceGoesAndComes) {
  const std::string point = folder / "CARD";
  auto first = std::make_unique<test::LoopMount>(point);
  makeFolder(point + "/DCIM");
  begin({folder.path()}, {});
  ASSERT_EQ(current(), Paths{point});
  const test::LoopMount second(folder / "second");
  makeFolder(folder / "second/DCIM");
  ASSERT_TRUE(becomes({point, folder / "second"}));
  ASSERT_TRUE(first->unmount());  // its mount identifier is free for the next mount
  ASSERT_EQ(::mount((folder / "second").c_str(), point.c_str(), nullptr, MS_MOVE, nullptr), 0);
  ASSERT_TRUE(waitUntil([&] {
    const auto all = allReports();
    return std::ranges::count(all, Paths{point}) >= 2 || (all.back() == Paths{point} && all.size() > 3);
  }));
  bool wasGone = false;
  for (const Paths& paths : allReports()) wasGone = wasGone || !paths.contains(point);
  EXPECT_TRUE(wasGone) << "the first card's end must be reported";
  ::umount2(point.c_str(), MNT_DETACH);
}

TEST_F(MountedVolumeTest, ASecondMountOfTheSameFileSystemIsNoSecondVolume) {
  const test::LoopMount card(folder / "CARD");
  makeFolder(folder / "CARD/DCIM");
  test::bindMount(folder / "CARD", folder / "again");
  begin({folder.path()}, {});
  EXPECT_EQ(current(), Paths{folder / "CARD"});
  test::unmountAt(folder / "again");
}

TEST_F(MountedVolumeTest, PseudoFileSystemsAndTheRootAreNone) {
  makeFolder(folder / "bound/DCIM");
  test::bindMount(folder / "bound", folder / "root");
  test::mountAt("tmpfs", folder / "memory", "tmpfs");
  makeFolder(folder / "memory/DCIM");
  begin({folder.path()}, {});
  EXPECT_THAT(current(), IsEmpty());
  test::unmountAt(folder / "memory");
  test::unmountAt(folder / "root");
}

TEST_F(MountedVolumeTest, AnOvermountHidesTheCard) {
  test::LoopMount card(folder / "in/CARD");
  makeFolder(folder / "in/CARD/DCIM");
  begin({folder.path()}, {});
  ASSERT_EQ(current(), Paths{folder / "in/CARD"});
  test::mountAt("tmpfs", folder / "in", "tmpfs");
  EXPECT_TRUE(becomes({})) << "the path leads elsewhere now";
  test::unmountAt(folder / "in");
  EXPECT_TRUE(becomes({folder / "in/CARD"}));
}

TEST_F(MountedVolumeTest, AVolumeThatDoesNotAnswerHoldsUpNoOther) {
  const test::LoopMount card(folder / "CARD");
  makeFolder(folder / "CARD/DCIM");
  const test::HungMount hung(folder / "hung");
  begin({folder.path()}, {});
  EXPECT_TRUE(becomes({folder / "CARD"}));
}

TEST_F(MountedVolumeTest, ABurstOfMountsEndsInTheRightSet) {
  const test::LoopMount card(folder / "CARD");
  makeFolder(folder / "CARD/DCIM");
  begin({folder.path()}, {});
  for (int i = 0; i < 50; ++i) test::bindMount(folder / "CARD", folder / ("b" + std::to_string(i)));
  for (int i = 0; i < 50; ++i) test::unmountAt(folder / ("b" + std::to_string(i)));
  const test::LoopMount late(folder / "late");
  makeFolder(folder / "late/DCIM");
  EXPECT_TRUE(becomes({folder / "CARD", folder / "late"}));
}

TEST_F(MountedVolumeTest, StatisticsTellTheMount) {
  const test::LoopMount card(folder / "CARD");
  auto statistics = volumeStatistics(folder / "CARD");
  EXPECT_EQ(statistics.typeName, "ext4");
  EXPECT_EQ(statistics.mountedOn, folder / "CARD");
  EXPECT_THAT(statistics.mountedFrom, testing::StartsWith("/dev/loop"));
  EXPECT_EQ(statistics.flags & 1, 0u);
  ASSERT_EQ(::mount(nullptr, card.point().c_str(), nullptr, MS_REMOUNT | MS_RDONLY, nullptr), 0);
  EXPECT_EQ(volumeStatistics(folder / "CARD").flags & 1, 1u);
}

TEST(VolumeStatisticsTest, APathThatIsNotThereHasNone) {
  EXPECT_EQ(volumeStatistics("/nowhere/at/all").flags, 0u);
}

TEST(ContainsPhotosTest, TheFolderMayBeWrittenInAnyLetterCaseButMustBeAFolder) {
  const TemporaryFolder folder;
  makeFolder(folder / "a/DcIm");
  makeFolder(folder / "b/MP_Root");
  makeFolder(folder / "c/sub/DCIM");
  test::writeFile(folder / "d/DCIM", "");
  EXPECT_TRUE(containsPhotos(folder / "a"));
  EXPECT_TRUE(containsPhotos(folder / "b"));
  EXPECT_FALSE(containsPhotos(folder / "c"));
  EXPECT_FALSE(containsPhotos(folder / "d"));
  EXPECT_FALSE(containsPhotos(folder / "none"));
}

}  // namespace
}  // namespace brivo
