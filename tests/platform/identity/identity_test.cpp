// SPDX-License-Identifier: MIT
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "platform/applications/desktop_catalogue.h"
#include "platform/identity/audit_token.h"
#include "platform/identity/sandbox_labels.h"
#include "platform/identity/task_identity.h"
#include "support/temporary_folder.h"

namespace brivo {
namespace {

class IdentityTest : public testing::Test {
 protected:
  test::TemporaryFolder folder;
  DesktopCatalogue catalogue{folder / "user", {folder / "system"}, "org.orvid."};
  TaskIdentity identity{catalogue};
};

TEST(AuditTokenTest, ThePeerOfAPairIsThisProcess) {
  int raw[2];
  ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, raw), 0);
  const UniqueFd a(raw[0]);
  const UniqueFd b(raw[1]);
  const AuditToken token = AuditToken::ofPeer(a.get());
  EXPECT_EQ(token.processIdentifier(), ::getpid());
  EXPECT_EQ(token.userIdentifier(), ::getuid());
  EXPECT_EQ(token.groupIdentifier(), ::getgid());
  EXPECT_GE(token.pidfd(), 0);
  EXPECT_TRUE(token.isAlive());
}

TEST(AuditTokenTest, WhatIsNoSocketHasNoPeer) {
  const AuditToken token = AuditToken::ofPeer(-1);
  EXPECT_EQ(token.processIdentifier(), -1);
  EXPECT_FALSE(token.isAlive());
}

TEST(AuditTokenTest, CredentialsFromElsewhereAreTakenAsTheyAre) {
  const AuditToken token = AuditToken::ofCredentials({::getpid(), 12, 34});
  EXPECT_EQ(token.processIdentifier(), ::getpid());
  EXPECT_EQ(token.userIdentifier(), 12u);
  EXPECT_EQ(token.groupIdentifier(), 34u);
  EXPECT_TRUE(token.isAlive());
}

TEST(AuditTokenTest, APidfdFromElsewhereIsOwnedByTheToken) {
  UniqueFd pidfd(static_cast<int>(::syscall(SYS_pidfd_open, ::getpid(), 0)));
  const int number = pidfd.get();
  {
    const AuditToken token =
        AuditToken::ofCredentials({::getpid(), ::getuid(), ::getgid()}, std::move(pidfd));
    EXPECT_EQ(token.pidfd(), number);
    EXPECT_TRUE(token.isAlive());
  }
  EXPECT_EQ(::fcntl(number, F_GETFD), -1);
}

TEST(AuditTokenTest, UnknownCredentialsAreNoProcess) {
  const AuditToken token = AuditToken::ofCredentials({});
  EXPECT_EQ(token.processIdentifier(), -1);
  EXPECT_EQ(token.userIdentifier(), static_cast<std::uint32_t>(-1));
  EXPECT_EQ(token.pidfd(), -1);
  EXPECT_FALSE(token.isAlive());
}

TEST_F(IdentityTest, WithoutADesktopFileItIsThePathOfTheExecutable) {
  char path[4096];
  const ssize_t size = ::readlink("/proc/self/exe", path, sizeof path);
  EXPECT_EQ(identity.codeSigningIdentifier(AuditToken::ofThisProcess()),
            std::string(path, static_cast<std::size_t>(size)));
}

TEST_F(IdentityTest, TheDesktopFileOfTheExecutableNamesIt) {
  test::writeFile(folder / "system/applications/org.example.Test.desktop",
                  "[Desktop Entry]\nType=Application\nExec=/proc/self/exe\n");
  EXPECT_EQ(identity.codeSigningIdentifier(AuditToken::ofThisProcess()), "org.example.Test");
}

TEST_F(IdentityTest, AProcessThatHasEndedHasNoIdentity) {
  UniqueFd listener(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  // A child that connects and ends: the credentials are its own, and the pidfd knows that it is gone.
  sockaddr address{AF_UNIX, {}};
  ASSERT_EQ(::bind(listener.get(), &address, sizeof address.sa_family), 0);  // autobind
  ASSERT_EQ(::listen(listener.get(), 1), 0);
  sockaddr_storage bound{};
  socklen_t size = sizeof bound;
  ASSERT_EQ(::getsockname(listener.get(), reinterpret_cast<sockaddr*>(&bound), &size), 0);
  const pid_t child = ::fork();
  if (child == 0) {
    const int fd = ::socket(AF_UNIX, SOCK_STREAM, 0);
    ::_exit(::connect(fd, reinterpret_cast<const sockaddr*>(&bound), size));
  }
  const UniqueFd peer(::accept(listener.get(), nullptr, nullptr));
  ASSERT_EQ(::waitpid(child, nullptr, 0), child);
  const AuditToken token = AuditToken::ofPeer(peer.get());
  EXPECT_EQ(token.processIdentifier(), child);
  EXPECT_FALSE(token.isAlive());
  EXPECT_EQ(identity.codeSigningIdentifier(token), std::nullopt);
}

TEST(SandboxLabelsTest, TheFlatpakIdIsTheNameOfTheApplicationGroup) {
  EXPECT_EQ(
      applicationInFlatpakInfo("[Application]\nname=org.example.App\nruntime=x\n[Context]\nname=other\n"),
      "org.example.App");
  EXPECT_EQ(applicationInFlatpakInfo("[Runtime]\nname=org.example.Runtime\n"), std::nullopt);
  EXPECT_EQ(applicationInFlatpakInfo("[Application]\nname=\n"), std::nullopt);
  EXPECT_EQ(applicationInFlatpakInfo(""), std::nullopt);
}

TEST(SandboxLabelsTest, TheSnapIsTheSecondPartOfItsLabel) {
  EXPECT_EQ(snapInSecurityLabel("snap.camera-app.import (enforce)"), "camera-app");
  EXPECT_EQ(snapInSecurityLabel("unconfined"), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel("snap."), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel("snap..x"), std::nullopt);
  EXPECT_EQ(snapInSecurityLabel(""), std::nullopt);
}

TEST(SandboxLabelsTest, AnEndedProcessHasNoIdentifierInFdinfo) {
  EXPECT_EQ(processInFdinfo("pos:\t0\nflags:\t02000002\nPid:\t1234\nNSpid:\t1234\n"), 1234);
  EXPECT_EQ(processInFdinfo("pos:\t0\nPid:\t-1\n"), std::nullopt);
  EXPECT_EQ(processInFdinfo("Pid:\t0\n"), std::nullopt);
  EXPECT_EQ(processInFdinfo("Pid:"), std::nullopt);
  EXPECT_EQ(processInFdinfo("NSpid:\t7\n"), std::nullopt);
}

}  // namespace
}  // namespace brivo
