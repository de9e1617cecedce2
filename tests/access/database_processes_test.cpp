// SPDX-License-Identifier: MIT
// Several processes and one database file.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <set>
#include <sstream>

#include "database_fixture.h"
#include "platform/base/unique_fd.h"

extern char** environ;

namespace brivo {
namespace {

using testing::ElementsAre;
using testing::IsSubsetOf;
using Clock = std::chrono::steady_clock;

/// A process that adds grants one after the other until it has added `count` or is killed.
class GrantingProcess {
 public:
  GrantingProcess(const std::string& folder, const std::string& prefix, int count) {
    int ends[2];
    if (::pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("no pipe");
    output_.reset(ends[0]);
    const UniqueFd input(ends[1]);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, input.get(), STDOUT_FILENO);
    std::string arguments[] = {GRANTING_PROCESS, folder, prefix, std::to_string(count)};
    char* pointers[] = {arguments[0].data(), arguments[1].data(), arguments[2].data(), arguments[3].data(),
                        nullptr};
    const int failed = ::posix_spawn(&pid_, GRANTING_PROCESS, &actions, nullptr, pointers, environ);
    posix_spawn_file_actions_destroy(&actions);
    if (failed != 0) throw std::runtime_error("cannot start " GRANTING_PROCESS);
  }
  ~GrantingProcess() {
    if (pid_ > 0) kill();
  }
  GrantingProcess(const GrantingProcess&) = delete;
  GrantingProcess& operator=(const GrantingProcess&) = delete;

  /// Waits for something to be acknowledged; false when nothing was within the time or will be any more.
  bool listen(std::chrono::nanoseconds limit) {
    pollfd readable{output_.get(), POLLIN, 0};
    const timespec time{limit.count() / 1'000'000'000, limit.count() % 1'000'000'000};
    if (::ppoll(&readable, 1, &time, nullptr) <= 0) return false;
    char part[4096];
    const ssize_t size = ::read(output_.get(), part, sizeof part);
    if (size > 0) acknowledged_.append(part, static_cast<std::size_t>(size));
    return size > 0;
  }
  void kill() {
    ::kill(pid_, SIGKILL);
    wait();
  }
  int wait() {
    while (listen(std::chrono::seconds(60))) {
    }
    int status = 0;
    ::waitpid(pid_, &status, 0);
    pid_ = -1;
    return status;
  }
  /// What has been acknowledged so far.
  std::vector<std::string> identifiers() const {
    std::vector<std::string> found;
    std::istringstream lines(acknowledged_);
    for (std::string line; std::getline(lines, line);) found.push_back(line);
    return found;
  }

 private:
  pid_t pid_ = -1;
  UniqueFd output_;
  std::string acknowledged_;
};

class DatabaseProcessesTest : public test::AccessDatabaseTest {};

TEST_F(DatabaseProcessesTest, TwoProcessesThatWriteAtOnceBothHaveTheirGrantsAfterwards) {
  const auto service = open();
  constexpr int each = 100;
  GrantingProcess first(folder(), "first", each);
  GrantingProcess second(folder(), "second", each);
  EXPECT_EQ(first.wait(), 0);
  EXPECT_EQ(second.wait(), 0);
  std::vector<std::string> expected = first.identifiers();
  for (std::string& identifier : second.identifiers()) expected.push_back(std::move(identifier));
  EXPECT_EQ(expected.size(), std::size_t{2 * each});
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(),
              testing::UnorderedElementsAreArray(expected));
  EXPECT_EQ(ask("PRAGMA integrity_check"), "ok");
}

/// How long one process takes for one grant.
std::chrono::nanoseconds timeOfAGrant(const std::string& folder) {
  constexpr int count = 50;
  GrantingProcess process(folder, "timed", count);
  EXPECT_TRUE(process.listen(std::chrono::seconds(60)));
  const auto start = Clock::now();
  EXPECT_EQ(process.wait(), 0);
  return (Clock::now() - start) / count;
}

TEST_F(DatabaseProcessesTest, AKilledWriterLeavesAValidFileWithAllThatItAcknowledged) {
  const auto service = open();
  const std::chrono::nanoseconds whole = timeOfAGrant(folder());
  std::set<std::string> acknowledged;
  int interrupted = 0;
  constexpr int moments = 100;  // spread over the time of one grant
  for (int i = 0; i < moments; ++i) {
    GrantingProcess process(folder(), "writer" + std::to_string(i), 1'000'000);
    ASSERT_TRUE(process.listen(std::chrono::seconds(60)));
    process.listen(whole * i / moments);
    process.kill();
    interrupted += std::filesystem::exists(file() + "-journal") ? 1 : 0;
    const auto last = process.identifiers();
    acknowledged.insert(last.begin(), last.end());
    ASSERT_EQ(ask("PRAGMA integrity_check"), "ok") << "killed at moment " << i;
    const auto found = service->bundleIdentifiersAccessingExternalCameras();
    ASSERT_THAT(last, IsSubsetOf(found)) << "killed at moment " << i;
  }
  const auto found = service->bundleIdentifiersAccessingExternalCameras();
  EXPECT_THAT(acknowledged, IsSubsetOf(found));
  EXPECT_GT(interrupted, 0) << "no kill fell into a write";
}

TEST_F(DatabaseProcessesTest, AWriteThatWasInterruptedIsUndoneByTheNextWhoLooks) {
  const auto service = open();
  service->addApplicationWithBundleIdentifier("org.example.App", true);
  const std::string good = test::readFile(file());
  // It ends with its change half in the file and the journal beside it.
  const std::string writer = "sqlite3 '" + file() +
                             "' 'PRAGMA cache_size = 1; BEGIN; INSERT INTO orvid_apps(bundle_id) SELECT "
                             "hex(zeroblob(3000)) FROM (VALUES (1),(2),(3),(4),(5),(6),(7),(8),(9));' "
                             "'.shell kill -KILL $PPID' 2>/dev/null";
  ASSERT_NE(std::system(writer.c_str()), 0);
  ASSERT_TRUE(std::filesystem::exists(file() + "-journal"));
  ASSERT_NE(test::readFile(file()).size(), good.size()) << "nothing was written yet";
  EXPECT_THAT(service->bundleIdentifiersAccessingExternalCameras(), ElementsAre("org.example.App"));
  EXPECT_TRUE(test::readFile(file()) == good);
}

}  // namespace
}  // namespace brivo
