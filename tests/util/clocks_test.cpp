// SPDX-License-Identifier: MIT
#include "util/clocks.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(ClocksTest, TheTimeOfDayEndsInTheNanosecondCountAndTwoBlanks) {
  EXPECT_THAT(__OVLogDateString(), testing::MatchesRegex("[0-2][0-9]:[0-5][0-9]:[0-6][0-9]: *[0-9]{3,9}  "));
}

TEST(ClocksTest, ATickIsANanosecond) {
  EXPECT_DOUBLE_EQ(OVConvertTimebaseToMilliseconds(2'500'000), 2.5);
  EXPECT_DOUBLE_EQ(OVConvertTimebaseToMilliseconds(0), 0.0);
}

TEST(ClocksTest, NegativeTicksCountAsLargeUnsignedOnes) {
  EXPECT_DOUBLE_EQ(OVConvertTimebaseToMilliseconds(-1), 18'446'744'073'709.551615);
}

TEST(ClocksTest, TheBenchmarkLineMarksMoreThan300Milliseconds) {
  EXPECT_EQ(benchmarkLine("Total Enumeration Time", 12.4F), "Total Enumeration Time   [   12 ms] {𝚫}");
  EXPECT_EQ(benchmarkLine("x", 300.0F), "x   [  300 ms] {𝚫}");
  EXPECT_EQ(benchmarkLine("x", 301.0F), "x   [  301 ms] {⊗}");
}

TEST(ClocksTest, TheLastBenchmarkResultIsKept) {
  startBenchmark();
  const float result = stopBenchmark();
  EXPECT_GE(result, 0.0F);
  EXPECT_EQ(lastBenchmarkResult(), result);
}

}  // namespace
}  // namespace brivo
