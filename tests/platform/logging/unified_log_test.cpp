// SPDX-License-Identifier: MIT
#include "platform/logging/unified_log.h"
#include "platform/logging/log_burst.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <thread>

#include "platform/logging/log_ring.h"
#include "support/environment.h"
#include "support/standard_error.h"

namespace brivo {
namespace {

using test::ScopedVariable;
using test::StandardErrorCapture;
using testing::HasSubstr;

TEST(UnifiedLogTest, LinesCarryTheirPriority) {
  const StandardErrorCapture capture;
  const UnifiedLog log("org.example", "test");
  log.write(LogLevel::standard, "hello");
  log.write(LogLevel::error, "trouble");
  EXPECT_EQ(capture.text(), "<5>hello\n<3>trouble\n");
}

TEST(UnifiedLogTest, DebugLinesAreOffUnlessWanted) {
  const StandardErrorCapture capture;
  {
    const ScopedVariable unset("BRIVOD_DEBUG", std::nullopt);
    const UnifiedLog log("org.example", "test");
    EXPECT_FALSE(log.enabled(LogLevel::debug));
    log.write(LogLevel::debug, "unseen");
  }
  const ScopedVariable set("BRIVOD_DEBUG", "1");
  const UnifiedLog log("org.example", "test");
  log.write(LogLevel::debug, "seen");
  EXPECT_EQ(capture.text(), "<7>seen\n");
}

TEST(UnifiedLogTest, ALineFromACardStaysOneLine) {
  const StandardErrorCapture capture;
  UnifiedLog("org.example", "test").write(LogLevel::standard, "name\n<0>forged\x1B[2J");
  EXPECT_EQ(capture.text(), "<5>name\\x0a<0>forged\\x1b[2J\n");
}

TEST(UnifiedLogTest, LinesAreNotLostWithoutAJournal) {
  // JOURNAL_STREAM of some other descriptor, as it is inherited by a service's redirected child.
  const ScopedVariable stream("JOURNAL_STREAM", "1:1");
  const StandardErrorCapture capture;
  UnifiedLog("org.example", "test").write(LogLevel::standard, "here");
  EXPECT_EQ(capture.text(), "<5>here\n");
}

TEST(LogRingTest, WritesInOrderBeforeItEnds) {
  const StandardErrorCapture capture;
  const UnifiedLog log("org.example", "test");
  std::thread([&] {
    const LogRing ring;
    for (int i = 0; i < 100; ++i) log.write(LogLevel::standard, std::to_string(i));
  }).join();
  std::string expected;
  for (int i = 0; i < 100; ++i) expected += "<5>" + std::to_string(i) + "\n";
  EXPECT_EQ(capture.text(), expected);
}

TEST(LogRingTest, AReaderThatDoesNotReadBlocksNobodyAndTheLossIsCounted) {
  int ends[2];
  ASSERT_EQ(::pipe2(ends, O_CLOEXEC), 0);
  const int saved = ::fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3);
  ::dup2(ends[1], STDERR_FILENO);
  const UnifiedLog log("org.example", "test");
  const std::string line(200, 'x');
  std::string text;
  std::thread([&] {
    const LogRing ring;
    for (std::size_t i = 0; i < 4 * LogRing::kMostLines; ++i) log.write(LogLevel::standard, line);
    // All of them were accepted or dropped without anybody reading. Now read, so that the ring can
    // end.
    std::thread([&] {
      char buffer[65536];
      ssize_t count = 0;
      while ((count = ::read(ends[0], buffer, sizeof buffer)) > 0) {
        text.append(buffer, static_cast<std::size_t>(count));
        if (text.find("lines dropped") != std::string::npos) break;
      }
    }).join();
  }).join();
  ::dup2(saved, STDERR_FILENO);
  for (const int fd : {saved, ends[0], ends[1]}) ::close(fd);
  EXPECT_THAT(text, HasSubstr("log lines dropped"));
  EXPECT_LT(std::ranges::count(text, '\n'), static_cast<long>(4 * LogRing::kMostLines));
}

TEST(LogBurstTest, LinesOfABurstAreAllThereWhenItGoesInTheirOrder) {
  const test::StandardErrorCapture captured;
  const UnifiedLog log("org.example", "test");
  {
    const LogBurst burst;
    for (int i = 0; i < 5; ++i) log.write(LogLevel::standard, std::to_string(i));
  }
  log.write(LogLevel::standard, "behind it");
  EXPECT_EQ(captured.text(), "<5>0\n<5>1\n<5>2\n<5>3\n<5>4\n<5>behind it\n");
}

TEST(LogBurstTest, AnErrorLineWaitsForNothing) {
  const test::StandardErrorCapture captured;
  const UnifiedLog log("org.example", "test");
  const LogBurst burst;
  log.write(LogLevel::standard, "one");
  log.write(LogLevel::standard, "two");
  log.write(LogLevel::error, "bad");
  EXPECT_EQ(captured.text(), "<5>one\n<5>two\n<3>bad\n");
}

TEST(LogBurstTest, OtherThreadsWriteAtOnce) {
  const test::StandardErrorCapture captured;
  const UnifiedLog log("org.example", "test");
  const LogBurst burst;
  log.write(LogLevel::standard, "first, at once");
  log.write(LogLevel::standard, "waits");
  std::thread([&] { log.write(LogLevel::standard, "another thread"); }).join();
  EXPECT_EQ(captured.text(), "<5>first, at once\n<5>another thread\n");
}

}  // namespace
}  // namespace brivo
