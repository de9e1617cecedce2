// SPDX-License-Identifier: MIT
#include "platform/text/regular_expression.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(RegularExpressionTest, WordAndDigitClassesFollowUnicode) {
  const RegularExpression word("^\\w{4}$");
  EXPECT_TRUE(word.matches("IMG_"));
  EXPECT_TRUE(
      word.matches("\xC3\x84"
                   "BC_"));
  EXPECT_FALSE(word.matches("IM-_"));
}

TEST(RegularExpressionTest, AnchorsMatchAtEveryLine) {
  const RegularExpression line("^ab$");
  EXPECT_TRUE(line.matches("xx\nab"));
  EXPECT_TRUE(line.matches("xx\rab\xE2\x80\xA8yy"));
  EXPECT_FALSE(line.matches("xab"));
}

TEST(RegularExpressionDeathTest, AnExpressionThatDoesNotCompileIsABug) {
  EXPECT_DEATH(RegularExpression("("), "does not compile");
}

}  // namespace
}  // namespace brivo
