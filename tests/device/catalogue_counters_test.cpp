// SPDX-License-Identifier: MIT
#include "device/catalogue_counters.h"

#include <gtest/gtest.h>

namespace brivo {
namespace {

TEST(CatalogueCountersTest, WithNothingAnnouncedItIs0Percent) {
  CatalogueCounters counters;
  counters.updateEnumeratedItemCountWithDelta(5);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 0u);
}

TEST(CatalogueCountersTest, TheShareIsRoundedDownAndNotLimitedTo100) {
  CatalogueCounters counters;
  counters.setMsObjectCount(3);
  counters.updateEnumeratedItemCountWithDelta(2);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 66u);
  counters.updateEnumeratedItemCountWithDelta(4);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 200u);
}

TEST(CatalogueCountersTest, ADoneCatalogueIs100Percent) {
  CatalogueCounters counters;
  counters.setCatalogingDone(true);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 100u);
}

TEST(CatalogueCountersTest, MoreRemovalsThanFilesAre0Percent) {
  CatalogueCounters counters;
  counters.setMsObjectCount(3);
  counters.updateEnumeratedItemCountWithDelta(0xFFFFFFFF);
  EXPECT_EQ(counters.enumeratedItemCount(), 0xFFFFFFFFu);
  EXPECT_EQ(counters.contentCatalogPercentCompleted(), 0u);
}

TEST(CatalogueCountersTest, CountsGoUpAndDown) {
  CatalogueCounters counters;
  counters.incrementMSObjectCount(5);
  counters.decrementMSObjectCount(2);
  EXPECT_EQ(counters.msObjectCount(), 3);
  counters.incrementPreflightObjectCount(4);
  EXPECT_EQ(counters.preflightCount(), 4);
  counters.resetPreflightCount();
  EXPECT_EQ(counters.preflightCount(), 0);
}

}  // namespace
}  // namespace brivo
