// SPDX-License-Identifier: MIT
// What peers in namespaces and sandboxes are known as.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <set>

#include "peer.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/identity/task_identity.h"
#include "support/descriptor_limit.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

namespace fs = std::filesystem;
using namespace std::string_literals;
using test::executing;
using test::makeProgram;
using test::Peer;

class SandboxedPeersTest : public testing::Test {
 protected:
  void SetUp() override {
    const auto tryIt = [] { return test::enterUserNamespace(CLONE_NEWNS | CLONE_NEWPID) ? 0 : 1; };
    if (test::runInChild(tryIt) != 0)
      GTEST_SKIP() << "namespaces may not be made here, or a sanitizer runs a thread beside";
  }

  std::optional<std::string> identifierOf(const Peer& peer) {
    return identity.codeSigningIdentifier(peer.token());
  }
  /// What a process is known as whose root is `root`.
  std::optional<std::string> identifierAtRoot() {
    return identifierOf(
        Peer([this] { return test::enterUserNamespace(CLONE_NEWNS) && ::chroot(root.c_str()) == 0; }));
  }
  /// What it is known as with fewer and fewer descriptors to find out with; "" when it is nobody.
  std::set<std::string> identifiersWithFewDescriptors(const Peer& peer) {
    std::set<std::string> identifiers;
    for (rlim_t spare = 0; spare < 8; ++spare) {
      const test::DescriptorLimit limit(spare);
      identifiers.insert(identifierOf(peer).value_or(""));
    }
    return identifiers;
  }
  /// Whether `condition` is true of a process whose label is what the file `label` says.
  bool holdsWithLabel(const std::string& label, const std::function<bool(const Peer&)>& condition) {
    const auto check = [&] {
      if (!test::enterUserNamespace(CLONE_NEWNS)) return 1;
      const Peer peer;
      if (identifierOf(peer) != self) return 2;
      const std::string file = "/proc/" + std::to_string(peer.pid()) + "/attr/current";
      if (::mount(label.c_str(), file.c_str(), nullptr, MS_BIND, nullptr) != 0) return 3;
      return condition(peer) ? 0 : 4;
    };
    return test::runInChild(check) == 0;
  }
  void describeFlatpak(std::string_view content) { test::writeFile(info, content); }

  test::TemporaryFolder folder;
  const std::string root = folder / "root";
  const std::string info = root + "/.flatpak-info";
  const std::string photos = makeProgram(folder / "photos");
  const std::string self = fs::read_symlink("/proc/self/exe");
  DesktopCatalogue catalogue{folder / "user", {folder / "system"}, "org.orvid."};
  TaskIdentity identity{catalogue};
};

TEST_F(SandboxedPeersTest, AFlatpakIsKnownByTheIdAtItsRoot) {
  describeFlatpak("[Application]\nname=org.example.Photos\nruntime=runtime/org.example.Platform\n");
  EXPECT_EQ(identifierAtRoot(), "org.example.Photos");
}

TEST_F(SandboxedPeersTest, AFlatpaksProgramsAndDesktopFilesDoNotMatter) {
  test::writeFile(folder / "system/applications/org.example.Other.desktop",
                  "[Desktop Entry]\nType=Application\nExec=" + self + "\n");
  describeFlatpak("[Application]\nname=org.example.Photos\n");
  EXPECT_EQ(identifierAtRoot(), "org.example.Photos");
}

TEST_F(SandboxedPeersTest, AnotherRootWithoutADescriptionIsNoFlatpak) {
  test::makeFolder(root);
  EXPECT_EQ(identifierAtRoot(), self);
}

TEST_F(SandboxedPeersTest, ADescriptionThatIsALinkNamesNobody) {
  test::writeFile(root + "/other", "[Application]\nname=org.example.Photos\n");
  fs::create_symlink("other", info);
  EXPECT_EQ(identifierAtRoot(), std::nullopt);
}

TEST_F(SandboxedPeersTest, ADescriptionThatIsAFifoNamesNobodyAndHoldsNobodyUp) {
  test::makeFolder(root);
  ASSERT_EQ(::mkfifo(info.c_str(), 0600), 0);
  EXPECT_EQ(identifierAtRoot(), std::nullopt);
}

TEST_F(SandboxedPeersTest, ADescriptionThatIsAFolderNamesNobody) {
  test::makeFolder(info);
  EXPECT_EQ(identifierAtRoot(), std::nullopt);
}

TEST_F(SandboxedPeersTest, AHugeDescriptionNamesNobody) {
  describeFlatpak("[Application]\nname=org.example.Photos\n");
  fs::resize_file(info, std::uintmax_t{1} << 40);
  EXPECT_EQ(identifierAtRoot(), std::nullopt);
}

TEST_F(SandboxedPeersTest, ABinaryDescriptionNamesNobody) {
  for (const std::string& content :
       {std::string(5000, '\0'), test::readFile("/bin/sleep"), "[Application]\nname=org.x\0y\n"s,
        std::string("[Application]\nname=org.example.\xFF\n"),
        std::string("[Application]\nname=/usr/bin/photos\n"),
        std::string("[Application]\nname=org.example.\x1B[2J\n"),
        std::string("[Runtime]\nname=org.example.Runtime\n"), std::string()}) {
    describeFlatpak(content);
    EXPECT_EQ(identifierAtRoot(), std::nullopt) << content;
  }
}

TEST_F(SandboxedPeersTest, WithoutDescriptorsAFlatpakIsNobodyAndNeverItsProgram) {
  describeFlatpak("[Application]\nname=org.example.Photos\n");
  const Peer peer([this] { return test::enterUserNamespace(CLONE_NEWNS) && ::chroot(root.c_str()) == 0; });
  EXPECT_EQ(identifiersWithFewDescriptors(peer), (std::set<std::string>{"", "org.example.Photos"}));
}

TEST_F(SandboxedPeersTest, ASnapIsKnownByItsLabelAndWithoutDescriptorsIsNobody) {
  if (!fs::exists("/proc/self/attr/current")) GTEST_SKIP() << "this kernel labels no processes";
  test::writeFile(folder / "label", "snap.camera-app.import (enforce)\n");
  EXPECT_TRUE(holdsWithLabel(folder / "label", [this](const Peer& peer) {
    return identifierOf(peer) == "camera-app" &&
           identifiersWithFewDescriptors(peer) == std::set<std::string>{"", "camera-app"};
  }));
}

TEST_F(SandboxedPeersTest, WhoseLabelCannotBeReadIsNobody) {
  if (!fs::exists("/proc/self/attr/current")) GTEST_SKIP() << "this kernel labels no processes";
  ASSERT_EQ(::mkfifo((folder / "label").c_str(), 0600), 0);
  EXPECT_TRUE(holdsWithLabel(folder / "label", [this](const Peer& peer) { return !identifierOf(peer); }));
}

TEST_F(SandboxedPeersTest, AProgramMountedOverAnotherIsNotTakenForIt) {
  const std::string other = makeProgram(folder / "other");
  const auto hidePhotos = [&] {
    return test::enterUserNamespace(CLONE_NEWNS) &&
           ::mount(other.c_str(), photos.c_str(), nullptr, MS_BIND, nullptr) == 0;
  };
  const Peer peer(hidePhotos, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos)) << "that is what it looks like from outside";
  EXPECT_EQ(identifierOf(peer), std::nullopt);
}

TEST_F(SandboxedPeersTest, APathThatOnlyTheirMountsHaveNamesNobody) {
  const std::string point = folder / "point";
  test::makeFolder(point);
  const auto mountPrograms = [&] {
    if (!test::enterUserNamespace(CLONE_NEWNS) || ::mount("none", point.c_str(), "tmpfs", 0, nullptr) != 0)
      return false;
    makeProgram(point + "/photos");
    return true;
  };
  const Peer peer(mountPrograms, executing(point + "/photos", {"1000"}));
  ASSERT_TRUE(peer.runs(point + "/photos"));
  EXPECT_EQ(identifierOf(peer), std::nullopt);
}

TEST_F(SandboxedPeersTest, AProgramIsKnownByItsDesktopFileWhereverItIsMounted) {
  const std::string elsewhere = folder / "elsewhere";
  test::writeFile(elsewhere, "");
  test::writeFile(folder / "system/applications/org.example.Photos.desktop",
                  "[Desktop Entry]\nType=Application\nExec=" + photos + "\n");
  const auto mountPhotos = [&] {
    return test::enterUserNamespace(CLONE_NEWNS) &&
           ::mount(photos.c_str(), elsewhere.c_str(), nullptr, MS_BIND, nullptr) == 0;
  };
  const Peer peer(mountPhotos, executing(elsewhere, {"1000"}));
  ASSERT_TRUE(peer.runs(elsewhere));
  EXPECT_EQ(identifierOf(peer), "org.example.Photos");
}

TEST_F(SandboxedPeersTest, APeerInAProcessNamespaceIsKnownByItsNumberOutside) {
  const Peer peer([] { return test::enterProcessNamespace(0) && ::getpid() == 1; });
  EXPECT_GT(peer.token().processIdentifier(), 1);
  EXPECT_EQ(identifierOf(peer), self);
}

TEST_F(SandboxedPeersTest, APeerThatHasNoNumberHereIsNobody) {
  const test::ListeningSocket socket;
  const UniqueFd outside(socket.connect());
  ASSERT_GE(outside.get(), 0);
  const auto accept = [&] {
    if (!test::enterProcessNamespace(CLONE_NEWNS)) return 2;
    ::mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr);
    if (::mount("proc", "/proc", "proc", 0, nullptr) != 0) return 3;
    const UniqueFd connection = socket.accept();
    const AuditToken token = AuditToken::ofPeer(connection.get());
    if (token.processIdentifier() != -1 || token.userIdentifier() == static_cast<uid_t>(-1)) return 4;
    return identity.codeSigningIdentifier(token) ? 5 : 0;
  };
  EXPECT_EQ(test::runInChild(accept), 0);
}

}  // namespace
}  // namespace brivo
