// SPDX-License-Identifier: MIT
// That a token stays with its process, also on kernels that have less to tell with.
#include "platform/identity/audit_token.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/sched.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstddef>
#include <ctime>
#include <filesystem>

#include "peer.h"
#include "platform/applications/desktop_catalogue.h"
#include "platform/identity/task_identity.h"
#include "support/processes.h"
#include "support/temporary_folder.h"
#include "support/wait.h"

namespace brivo {
namespace {

using test::Peer;

class AuditTokenTest : public testing::Test {
 protected:
  test::TemporaryFolder folder;
  DesktopCatalogue catalogue{folder / "user", {}, "org.orvid."};
  TaskIdentity identity{catalogue};
  const std::string self = std::filesystem::read_symlink("/proc/self/exe");
};

TEST_F(AuditTokenTest, ThePeerOfAPairIsThisProcess) {
  int raw[2];
  ASSERT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, raw), 0);
  const UniqueFd a(raw[0]);
  const UniqueFd b(raw[1]);
  const AuditToken token = AuditToken::ofPeer(a.get());
  EXPECT_EQ(token.processIdentifier(), ::getpid());
  EXPECT_EQ(token.userIdentifier(), ::getuid());
  EXPECT_GE(token.pidfd(), 0);
  EXPECT_TRUE(token.isAlive());
}

TEST_F(AuditTokenTest, WhatIsNoSocketHasNoPeer) {
  const AuditToken token = AuditToken::ofPeer(-1);
  EXPECT_EQ(token.processIdentifier(), -1);
  EXPECT_FALSE(token.isAlive());
}

TEST_F(AuditTokenTest, CredentialsFromElsewhereAreTakenAsTheyAre) {
  const AuditToken token = AuditToken::ofCredentials({::getpid(), 12});
  EXPECT_EQ(token.processIdentifier(), ::getpid());
  EXPECT_EQ(token.userIdentifier(), 12u);
  EXPECT_TRUE(token.isAlive());
}

TEST_F(AuditTokenTest, APidfdFromElsewhereIsOwnedByTheToken) {
  UniqueFd pidfd(static_cast<int>(::syscall(SYS_pidfd_open, ::getpid(), 0)));
  const int number = pidfd.get();
  {
    const AuditToken token = AuditToken::ofCredentials({::getpid(), ::getuid()}, std::move(pidfd));
    EXPECT_EQ(token.pidfd(), number);
    EXPECT_TRUE(token.isAlive());
  }
  EXPECT_EQ(::fcntl(number, F_GETFD), -1);
}

TEST_F(AuditTokenTest, UnknownCredentialsAreNoProcess) {
  const AuditToken token = AuditToken::ofCredentials({});
  EXPECT_EQ(token.processIdentifier(), -1);
  EXPECT_EQ(token.userIdentifier(), static_cast<std::uint32_t>(-1));
  EXPECT_EQ(token.pidfd(), -1);
  EXPECT_FALSE(token.isAlive());
}

/// A child with a process identifier of our choice, which takes rights that only root has; -1 without them.
pid_t forkAs(pid_t pid) {
  clone_args arguments{};
  arguments.exit_signal = SIGCHLD;
  arguments.set_tid = reinterpret_cast<std::uintptr_t>(&pid);
  arguments.set_tid_size = 1;
  const auto child = static_cast<pid_t>(::syscall(SYS_clone3, &arguments, sizeof arguments));
  if (child != 0) return child;
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  for (;;) ::pause();
}

void endChild(pid_t child) {
  ::kill(child, SIGKILL);
  ::waitpid(child, nullptr, 0);
}

/// Start times are in hundredths of a second: two processes that are to differ must not share one.
void waitForTheNextTick() {
  const auto tick = [] {
    timespec time{};
    ::clock_gettime(CLOCK_BOOTTIME, &time);
    return time.tv_sec * 100 + time.tv_nsec / 10'000'000;
  };
  test::waitUntil([start = tick(), tick] { return tick() > start + 1; });
}

constexpr sock_filter statement(std::uint16_t code, std::uint32_t k) { return {code, 0, 0, k}; }
constexpr sock_filter unless(std::uint32_t value, std::uint8_t skipped) {
  return {BPF_JMP | BPF_JEQ | BPF_K, 0, skipped, value};
}

/// From here on, this process has a kernel from before SO_PEERPIDFD and, if so wished, pidfd_open(2).
bool forgetPidfds(bool alsoOpen) {
  constexpr std::uint32_t load = BPF_LD | BPF_W | BPF_ABS;
  constexpr std::uint32_t give = BPF_RET | BPF_K;
  constexpr std::uint32_t peerPidfd = 77;
  sock_filter program[] = {
      statement(load, offsetof(seccomp_data, nr)),      unless(alsoOpen ? SYS_pidfd_open : 0xFFFFFFFF, 1),
      statement(give, SECCOMP_RET_ERRNO | ENOSYS),      unless(SYS_getsockopt, 3),
      statement(load, offsetof(seccomp_data, args[2])), unless(peerPidfd, 1),
      statement(give, SECCOMP_RET_ERRNO | ENOPROTOOPT), statement(give, SECCOMP_RET_ALLOW),
  };
  const sock_fprog filter{std::size(program), program};
  return ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
}

TEST_F(AuditTokenTest, AReusedProcessIdentifierIsNotTakenForThePeer) {
  Peer peer;
  const pid_t pid = peer.pid();
  ASSERT_EQ(identity.codeSigningIdentifier(peer.token()), self);
  peer.kill();
  peer.reap();
  const pid_t later = forkAs(pid);
  if (later < 0 && errno == EPERM) GTEST_SKIP() << "only root may choose a process identifier";
  ASSERT_EQ(later, pid);
  EXPECT_FALSE(peer.token().isAlive());
  EXPECT_EQ(peer.token().currentProcessIdentifier(), std::nullopt);
  EXPECT_EQ(identity.codeSigningIdentifier(peer.token()), std::nullopt);
  const AuditToken asked = AuditToken::ofPeer(peer.connection().get());
  EXPECT_EQ(asked.processIdentifier(), pid);
  if (AuditToken::ofThisProcess().pidfd() >= 0) {
    EXPECT_EQ(identity.codeSigningIdentifier(asked), std::nullopt) << "the socket knows who connected";
  }
  endChild(later);
}

TEST_F(AuditTokenTest, WithoutAPidfdOfTheSocketTheProcessIsHeldFromTheStart) {
  const auto check = [this] {
    if (!forgetPidfds(false)) return 1;
    Peer peer;
    if (peer.token().pidfd() < 0 || !peer.token().isAlive()) return 2;
    if (identity.codeSigningIdentifier(peer.token()) != self) return 3;
    peer.kill();
    peer.reap();
    return identity.codeSigningIdentifier(peer.token()) ? 4 : 0;
  };
  EXPECT_EQ(test::runInChild(check), 0);
}

TEST_F(AuditTokenTest, WithoutPidfdsTheStartTimeTellsAPeerFromALaterProcess) {
  constexpr int skipped = 9;
  const auto check = [this] {
    if (!forgetPidfds(true)) return 1;
    Peer peer;
    const pid_t pid = peer.pid();
    if (peer.token().pidfd() >= 0 || !peer.token().isAlive()) return 2;
    if (identity.codeSigningIdentifier(peer.token()) != self) return 3;
    waitForTheNextTick();
    peer.kill();
    if (!test::waitUntil([&] { return !test::isRunning(pid); })) return 4;
    if (peer.token().isAlive() || peer.token().currentProcessIdentifier()) return 5;  // not reaped yet
    peer.reap();
    if (identity.codeSigningIdentifier(peer.token())) return 6;
    const pid_t later = forkAs(pid);
    if (later != pid) return errno == EPERM ? skipped : 7;
    const bool mistaken = identity.codeSigningIdentifier(peer.token()).has_value();
    endChild(later);
    return mistaken ? 8 : 0;
  };
  const int result = test::runInChild(check);
  if (result == skipped) GTEST_SKIP() << "only root may choose a process identifier";
  EXPECT_EQ(result, 0);
}

}  // namespace
}  // namespace brivo
