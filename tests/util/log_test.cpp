// SPDX-License-Identifier: MIT
#include "util/log.h"

#include <gtest/gtest.h>

#include <cstdlib>

#include "support/environment.h"
#include "support/standard_error.h"

namespace brivo {
namespace {

using test::ScopedVariable;
using test::StandardErrorCapture;

class LevelGuard {
 public:
  LevelGuard() : saved_(OVLoggingLevel) {}
  ~LevelGuard() { OVLoggingLevel = saved_; }

 private:
  unsigned saved_;
};

TEST(LogTest, ATagOf20CharactersPrintsWholeAndOneOf21AsItsFirst18AndTwoDots) {
  const StandardErrorCapture capture;
  OVLog("abcdefghijklmnopqrst", "message");
  OVLog("abcdefghijklmnopqrstu", "message");
  EXPECT_EQ(capture.text(), "<5>abcdefghijklmnopqrst | message\n<5>abcdefghijklmnopqr.. | message\n");
}

TEST(LogTest, TagsAreRightAlignedAndErrorsMarkedWithAnExclamationMark) {
  const StandardErrorCapture capture;
  OVLog("CM", "[{:05}] Added Client", 42);
  OVLogError("CM", "no");
  OVLog("", "no tag");
  EXPECT_EQ(capture.text(),
            "<5>                  CM | [00042] Added Client\n"
            "<3>                  CM ! no\n"
            "<5>                     | no tag\n");
}

TEST(LogTest, TagsAreCutBetweenCharacters) {
  const StandardErrorCapture capture;
  std::string tag;
  for (int i = 0; i < 21; ++i) tag += "\xC3\xA4";
  OVLog(tag, "x");
  EXPECT_EQ(capture.text(), "<5>" + tag.substr(0, 36) + ".. | x\n");
}

TEST(LogTest, WithLevel0TheVerboseMasksYield0) {
  const LevelGuard guard;
  OVLoggingLevel = 0;
  EXPECT_EQ(__OVLogTypeEnabled(2), 0u);
  EXPECT_EQ(__OVLogTypeEnabled(4), 0u);
  OVLoggingLevel = 3075;
  EXPECT_EQ(__OVLogTypeEnabled(2), 2u);
  EXPECT_EQ(__OVLogTypeEnabled(4), 0u);
}

TEST(LogTest, AVerboseLineIsNotEvenFormattedWhileItsClassIsOff) {
  const LevelGuard guard;
  const StandardErrorCapture capture;
  OVLoggingLevel = 0;
  OVLogVerbose(kLogTypeDetail, "t", "{}", "unseen");
  OVLogVerboseOrDebug(kLogTypeContent, "t", "{}", "unseen");
  OVLoggingLevel = kLogTypeDetail | kLogTypeContent;
  OVLogVerbose(kLogTypeDetail, "t", "{}", "one");
  OVLogVerboseOrDebug(kLogTypeContent, "t", "{}", "two");
  EXPECT_EQ(capture.text(), "<5>                   t | one\n<5>                   t | two\n");
}

TEST(LogTest, TheLineEndOfAFormatIsNotShown) {
  const StandardErrorCapture capture;
  OVLogError("t", "monitoring error: {}\n", "gone");
  EXPECT_EQ(capture.text(), "<3>                   t ! monitoring error: gone\n");
}

/// In a process of its own: what is silenced stays so.
TEST(LogTest, TheLaunchMessageIsPrintedOnlyWhileTheDefaultLevelIsOn) {
  const ScopedVariable debug("BRIVOD_DEBUG", std::nullopt);
  const ScopedVariable journal("JOURNAL_STREAM", std::nullopt);
  const auto launch = [] {
    OVLog("brivo[zeph]", "{}", "Launching brivo [zeph]");
    std::exit(EXIT_SUCCESS);
  };
  EXPECT_EXIT(launch(), testing::ExitedWithCode(EXIT_SUCCESS),
              "brivo\\[zeph\\] \\| Launching brivo \\[zeph\\]");
  const auto silenced = [&] {
    UnifiedLog::silence();
    launch();
  };
  EXPECT_EXIT(silenced(), testing::ExitedWithCode(EXIT_SUCCESS), "^$");
}

}  // namespace
}  // namespace brivo
