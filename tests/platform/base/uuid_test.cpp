// SPDX-License-Identifier: MIT
#include "platform/base/uuid.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

namespace brivo {
namespace {

TEST(UuidTest, IsCanonicalUpperCaseVersion4) {
  EXPECT_THAT(randomUuidString(),
              testing::MatchesRegex("[0-9A-F]{8}-[0-9A-F]{4}-4[0-9A-F]{3}-[89AB][0-9A-F]{3}-[0-9A-F]{12}"));
}

TEST(UuidTest, EveryOneIsNew) {
  std::set<std::string> seen;
  for (int i = 0; i < 1000; ++i) seen.insert(randomUuidString());
  EXPECT_EQ(seen.size(), 1000u);
}

}  // namespace
}  // namespace brivo
