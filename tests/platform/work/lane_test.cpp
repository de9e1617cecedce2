// SPDX-License-Identifier: MIT
#include "platform/work/lane.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <semaphore>

#include "support/wait.h"

namespace brivo {
namespace {

using test::waitUntil;

TEST(LaneTest, NeverRunsMoreThanItsWidthAtOnce) {
  std::atomic<int> running = 0;
  std::atomic<int> most = 0;
  std::atomic<int> ran = 0;
  {
    Pool pool(8);
    const auto lane = Lane::create(pool, 3);
    for (int i = 0; i < 2000; ++i) {
      lane->post([&] {
        const int now = ++running;
        int seen = most;
        while (now > seen && !most.compare_exchange_weak(seen, now)) {
        }
        --running;
        ++ran;
      });
    }
  }
  EXPECT_EQ(ran, 2000);
  EXPECT_LE(most, 3);
}

TEST(LaneTest, AStuckLaneLeavesTheRestOfThePoolAlone) {
  Pool pool(4);
  const auto dying = Lane::create(pool, 2);
  const auto healthy = Lane::create(pool, 2);
  std::counting_semaphore<> release(0);
  for (int i = 0; i < 50; ++i) dying->post([&] { release.acquire(); });
  std::atomic<int> ran = 0;
  for (int i = 0; i < 100; ++i) healthy->post([&] { ++ran; });
  EXPECT_TRUE(waitUntil([&] { return ran == 100; }));
  EXPECT_LE(pool.threadCount(), 5u) << "a stuck card holds as many threads as its lane is wide";
  release.release(50);
}

}  // namespace
}  // namespace brivo
