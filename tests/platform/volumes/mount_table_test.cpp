// SPDX-License-Identifier: MIT
#include "platform/volumes/mount_table.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::vector<std::string> points(const std::vector<Mount>& mounts) {
  std::vector<std::string> points;
  for (const Mount& mount : mounts) points.push_back(mount.point);
  return points;
}

constexpr const char* kRoot = "22 1 8:2 / / rw,relatime - ext4 /dev/sda2 rw\n";

std::vector<std::string> volumes(const std::string& lines) {
  return points(volumeMounts(parseMountTable(kRoot + lines), {"/media", "/mnt"}));
}

TEST(MountTableTest, ReadsALine) {
  const auto table = parseMountTable(
      "36 35 98:0 /mnt1 /media/card rw,noatime master:1 shared:7 - ext3 /dev/root rw,errors=continue\n");
  ASSERT_EQ(table.size(), 1u);
  EXPECT_EQ(table[0], (Mount{36, 98, 0, "/mnt1", "/media/card", "ext3", "/dev/root", false}));
}

TEST(MountTableTest, OptionalFieldsVaryInNumber) {
  EXPECT_EQ(parseMountTable("1 0 8:1 / /a rw - ext4 /dev/x rw\n")[0].type, "ext4");
  EXPECT_EQ(
      parseMountTable("1 0 8:1 / /a rw shared:1 master:2 propagate_from:3 unbindable - ext4 /dev/x rw\n")[0]
          .type,
      "ext4");
}

TEST(MountTableTest, PathsAreUnescaped) {
  const auto table = parseMountTable("1 0 8:1 / /media/A\\040B\\012C\\134D\\011 rw - ext4 /dev/x rw\n");
  EXPECT_EQ(table[0].point, "/media/A B\nC\\D\t");
}

TEST(MountTableTest, ReadOnlyIsSaidByEitherOptions) {
  EXPECT_TRUE(parseMountTable("1 0 8:1 / /a ro,nosuid - ext4 /dev/x rw\n")[0].readOnly);
  EXPECT_TRUE(parseMountTable("1 0 8:1 / /a rw - ext4 /dev/x ro,norecovery\n")[0].readOnly);
  EXPECT_FALSE(parseMountTable("1 0 8:1 / /a rw,errors=remount-ro - ext4 /dev/x rw\n")[0].readOnly);
}

TEST(MountTableTest, BadLinesAreSkipped) {
  const std::string good = "1 0 8:1 / /a rw - ext4 /dev/x rw\n";
  for (const std::string bad :
       {"", "\n", "x", "1 0 8:1 / /a rw ext4 /dev/x rw", "a 0 8:1 / /a rw - ext4 /dev/x rw",
        "1 0 81 / /a rw - ext4 x rw", "1 0 8: / /a rw - ext4 x rw", "1 0 8:1 / a rw - ext4 x rw",
        "1 0 8:1 / /a rw - "}) {
    EXPECT_THAT(parseMountTable(bad + "\n" + good), testing::SizeIs(1)) << bad;
  }
}

TEST(VolumeMountsTest, CardsAtOrBelowARootAreVolumes) {
  EXPECT_THAT(volumes("30 22 8:17 / /media/user/CARD rw - exfat /dev/sdb1 rw\n"
                      "31 22 7:0 / /mnt rw - fuseblk /dev/loop0 rw\n"
                      "32 22 8:33 / /home/user/card rw - vfat /dev/sdc1 rw\n"
                      "33 22 0:50 / /media/btrfs rw - btrfs /dev/sdd1 rw\n"
                      "34 22 0:51 / /media/fat rw - fuse.fusefat fusefat rw\n"),
              ElementsAre("/media/user/CARD", "/mnt", "/media/btrfs", "/media/fat"));
}

TEST(VolumeMountsTest, NetworkAndPseudoFileSystemsAreNone) {
  EXPECT_THAT(volumes("30 22 0:40 / /media/n rw - nfs4 host:/x rw\n"
                      "31 22 0:41 / /media/c rw - cifs //host/x rw\n"
                      "32 22 0:42 / /media/t rw - tmpfs tmpfs rw\n"
                      "33 22 0:43 / /media/p rw - proc proc rw\n"
                      "34 22 0:44 / /media/s rw - fuse.sshfs host:/x rw\n"
                      "35 22 0:45 / /media/o rw - overlay overlay rw\n"
                      "36 22 0:46 / /media/9 rw - 9p host rw\n"
                      "37 22 0:47 / /media/g rw - fuse.gvfsd-fuse gvfsd-fuse rw\n"),
              IsEmpty());
}

TEST(VolumeMountsTest, AnAutomountTrapIsNoneAndWhatMountsOverItIs) {
  const std::string trap = "30 22 0:40 / /media/a rw - autofs systemd-1 rw,fd=5,direct\n";
  EXPECT_THAT(volumes(trap), IsEmpty());
  EXPECT_THAT(volumes(trap + "31 30 8:17 / /media/a rw - vfat /dev/sdb1 rw\n"), ElementsAre("/media/a"));
}

TEST(VolumeMountsTest, TheRootAndItsFileSystemAreNone) {
  EXPECT_THAT(points(volumeMounts(parseMountTable(kRoot), {"/"})), IsEmpty());
  EXPECT_THAT(volumes("30 22 8:2 /home/x /media/x rw - ext4 /dev/sda2 rw\n"), IsEmpty());
}

TEST(VolumeMountsTest, AFileSystemMountedTwiceIsOneVolume) {
  const std::string second = "31 22 8:17 /DCIM /media/b rw - exfat /dev/sdb1 rw\n";
  EXPECT_THAT(volumes("30 22 8:17 / /media/a rw - exfat /dev/sdb1 rw\n" + second), ElementsAre("/media/a"));
  EXPECT_THAT(volumes(second), ElementsAre("/media/b")) << "when the first is gone";
}

TEST(VolumeMountsTest, OfTwoMountsAtOnePlaceTheLaterCounts) {
  const auto found =
      volumeMounts(parseMountTable(std::string(kRoot) + "30 22 8:17 / /media/a rw - exfat /dev/sdb1 rw\n"
                                                        "31 30 8:33 / /media/a rw - vfat /dev/sdc1 rw\n"),
                   {"/media"});
  ASSERT_EQ(found.size(), 1u);
  EXPECT_EQ(found[0].source, "/dev/sdc1");
}

TEST(MountOfTest, TheDeepestMountHolds) {
  const auto table = parseMountTable(std::string(kRoot) + "30 22 8:17 / /media/a rw - exfat /dev/sdb1 rw\n");
  EXPECT_EQ(mountOf(table, "/media/a/DCIM")->point, "/media/a");
  EXPECT_EQ(mountOf(table, "/media/ab")->point, "/");
  EXPECT_EQ(mountOf({}, "/x"), nullptr);
}

}  // namespace
}  // namespace brivo
