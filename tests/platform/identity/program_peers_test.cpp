// SPDX-License-Identifier: MIT
// What programs that are not in a sandbox are known as.
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <filesystem>
#include <thread>

#include "peer.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/identity/task_identity.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

namespace fs = std::filesystem;
using test::executing;
using test::makeProgram;
using test::Peer;

class ProgramPeersTest : public testing::Test {
 protected:
  void install(const std::string& dataDir, const std::string& identifier, const std::string& command) {
    test::writeFile(folder / (dataDir + "/applications/" + identifier + ".desktop"),
                    "[Desktop Entry]\nType=Application\nExec=" + command + "\n");
  }
  std::optional<std::string> identifierOf(const Peer& peer) {
    return identity.codeSigningIdentifier(peer.token());
  }

  test::TemporaryFolder folder;
  const std::string photos = makeProgram(folder / "photos");
  DesktopCatalogue catalogue{folder / "user", {folder / "system"}, "org.orvid."};
  TaskIdentity identity{catalogue};
};

TEST_F(ProgramPeersTest, AProgramWithoutADesktopFileIsKnownByItsPath) {
  const Peer peer(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  EXPECT_EQ(identifierOf(peer), photos);
}

TEST_F(ProgramPeersTest, AProgramThatIsCalledThroughALinkIsKnownByWhatItIs) {
  fs::create_symlink(photos, folder / "link");
  const Peer peer(nullptr, executing(folder / "link", {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  EXPECT_EQ(identifierOf(peer), photos);
}

TEST_F(ProgramPeersTest, AProgramThatTookThePlaceOfTheConnectingOneIsWhoIsKnown) {
  install("system", "org.example.Photos", photos);
  const Peer before;
  const Peer after(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(after.runs(photos));
  EXPECT_NE(identifierOf(before), "org.example.Photos");
  EXPECT_EQ(identifierOf(after), "org.example.Photos");
}

TEST_F(ProgramPeersTest, AConnectionThatOutlivesWhoMadeItIsNobodys) {
  Peer peer(nullptr, [](int connection) -> bool {
    if (::fork() > 0) ::_exit(0);
    char byte;
    ::_exit(::read(connection, &byte, 1) == 0 ? 0 : 1);  // holds the connection until we close it
  });
  peer.reap();
  EXPECT_EQ(identifierOf(peer), std::nullopt);
  EXPECT_EQ(::write(peer.connection().get(), "", 0), 0);
}

TEST_F(ProgramPeersTest, AProgramThatWasDeletedSinceItsStartIsNobody) {
  install("system", "org.example.Photos", photos);
  const Peer peer(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  EXPECT_EQ(identifierOf(peer), "org.example.Photos");
  fs::remove(photos);
  EXPECT_EQ(identifierOf(peer), std::nullopt);
}

TEST_F(ProgramPeersTest, AProgramThatWasReplacedSinceItsStartIsNobodyAndTheNewOneIsKnown) {
  install("system", "org.example.Photos", photos);
  const Peer old(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(old.runs(photos));
  fs::rename(makeProgram(folder / "new"), photos);
  EXPECT_EQ(identifierOf(old), std::nullopt);
  const Peer started(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(started.runs(photos));
  EXPECT_EQ(identifierOf(started), "org.example.Photos");
}

TEST_F(ProgramPeersTest, AFileWhoseNameEndsLikeADeletedOnesIsKnownByItsName) {
  const std::string program = makeProgram(folder / "photos (deleted)");
  const Peer peer(nullptr, executing(program, {"1000"}));
  ASSERT_TRUE(peer.runs(program));
  EXPECT_EQ(identifierOf(peer), program);
}

TEST_F(ProgramPeersTest, ADeletedProgramIsNotTakenForAFileThatIsNamedLikeIt) {
  const Peer peer(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  fs::remove(photos);
  makeProgram(photos + " (deleted)");
  EXPECT_EQ(identifierOf(peer), std::nullopt);
}

TEST_F(ProgramPeersTest, AProgramThatNeverHadAPathIsNobody) {
  const UniqueFd program(::memfd_create("/usr/bin/photos", MFD_CLOEXEC));
  const std::string bytes = test::readFile("/bin/sleep");
  ASSERT_EQ(::write(program.get(), bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
  const Peer peer(nullptr, executing("/proc/self/fd/" + std::to_string(program.get()), {"1000"}));
  ASSERT_TRUE(peer.runs("/memfd:/usr/bin/photos (deleted)"));
  EXPECT_EQ(identifierOf(peer), std::nullopt);
}

TEST_F(ProgramPeersTest, AUsersDesktopFileCannotClaimAVendorId) {
  install("user", "org.orvid.Photos", photos);
  const Peer peer(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  EXPECT_EQ(identifierOf(peer), photos);
  install("system", "org.orvid.Photos", photos);
  EXPECT_EQ(identifierOf(peer), "org.orvid.Photos");
}

TEST_F(ProgramPeersTest, OfTwoDesktopFilesForOneProgramTheUsersComesFirstAndThenTheFirstByName) {
  install("system", "org.example.B", photos);
  install("system", "org.example.A", photos);
  const Peer peer(nullptr, executing(photos, {"1000"}));
  ASSERT_TRUE(peer.runs(photos));
  EXPECT_EQ(identifierOf(peer), "org.example.A");
  install("user", "org.example.C", photos);
  EXPECT_EQ(identifierOf(peer), "org.example.C");
}

TEST_F(ProgramPeersTest, AScriptIsKnownByItsInterpreter) {
  const std::string python = fs::canonical("/usr/bin/python3");
  const std::string script = folder / "import-photos";
  test::writeFile(script, "#!/usr/bin/python3\nimport signal\nsignal.pause()\n");
  fs::permissions(script, fs::perms::owner_all);
  install("system", "org.example.Script", script);
  const Peer peer(nullptr, executing(script, {}));
  ASSERT_TRUE(peer.runs(python));
  EXPECT_EQ(identifierOf(peer), python);
}

TEST_F(ProgramPeersTest, ADesktopFileThatNamesAnInterpreterNamesAllItsScripts) {
  const std::string python = fs::canonical("/usr/bin/python3");
  install("system", "org.example.Script", "/usr/bin/python3 /usr/share/example/script.py");
  const Peer peer(nullptr, executing(python, {"-c", "import signal; signal.pause()"}));
  ASSERT_TRUE(peer.runs(python));
  EXPECT_EQ(identifierOf(peer), "org.example.Script");
}

TEST_F(ProgramPeersTest, APeerThatDiesInTheMiddleIsItselfOrNobody) {
  const std::string self = fs::read_symlink("/proc/self/exe");
  for (int i = 0; i < 100; ++i) {
    Peer peer;
    std::thread killer([&] { peer.kill(); });
    while (peer.token().isAlive()) {
      const auto identifier = identifierOf(peer);
      EXPECT_TRUE(!identifier || *identifier == self) << *identifier;
    }
    EXPECT_EQ(identifierOf(peer), std::nullopt) << "not reaped yet";
    killer.join();
    peer.reap();
    EXPECT_EQ(identifierOf(peer), std::nullopt);
  }
}

TEST_F(ProgramPeersTest, APeerThatBecomesAnotherProgramInTheMiddleIsOneOfTheTwo) {
  const std::string self = fs::read_symlink("/proc/self/exe");
  install("system", "org.example.Photos", photos);
  for (int i = 0; i < 50; ++i) {
    const Peer peer(nullptr, executing(photos, {"1000"}));
    std::optional<std::string> identifier;
    while (identifier != "org.example.Photos") {
      identifier = identifierOf(peer);
      EXPECT_TRUE(!identifier || *identifier == self || *identifier == "org.example.Photos") << *identifier;
      ASSERT_TRUE(peer.token().isAlive());
    }
  }
}

}  // namespace
}  // namespace brivo
