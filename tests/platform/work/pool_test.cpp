// SPDX-License-Identifier: MIT
#include "platform/work/pool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <latch>
#include <semaphore>
#include <set>

#include "support/wait.h"

namespace brivo {
namespace {

using test::waitUntil;

TEST(PoolTest, RunsEverythingBeforeItEnds) {
  std::atomic<int> ran = 0;
  {
    Pool pool(2);
    for (int i = 0; i < 10000; ++i) pool.post([&] { ++ran; });
  }
  EXPECT_EQ(ran, 10000);
}

TEST(PoolTest, StuckTasksDoNotStarveTheRest) {
  Pool pool(2);
  std::binary_semaphore release(0);
  std::atomic<int> stuck = 0;
  constexpr int kStuck = 10;
  for (int i = 0; i < kStuck; ++i) {
    pool.post([&] {
      ++stuck;
      release.acquire();
      release.release();
    });
  }
  std::binary_semaphore ran(0);
  pool.post([&] { ran.release(); });
  EXPECT_TRUE(ran.try_acquire_for(std::chrono::seconds(20)));
  EXPECT_EQ(stuck, kStuck);
  EXPECT_GT(pool.threadCount(), std::size_t{kStuck});
  release.release();
}

TEST(PoolTest, AStuckTaskBehindAnIdleThreadIsNoticedToo) {
  Pool pool(2);
  ASSERT_TRUE(waitUntil([&] { return pool.threadCount() == 2; }));
  std::counting_semaphore<> release(0);
  std::latch started(3);
  for (int i = 0; i < 3; ++i) {  // one more than there are threads, posted while all are idle
    pool.post([&] {
      started.count_down();
      release.acquire();
    });
  }
  EXPECT_TRUE(waitUntil([&] { return started.try_wait(); }));
  release.release(3);
}

TEST(PoolTest, ThreadsThatJoinedLeaveAgain) {
  Pool pool(2);
  std::counting_semaphore<> release(0);
  std::latch started(6);
  for (int i = 0; i < 6; ++i) {
    pool.post([&] {
      started.count_down();
      release.acquire();
    });
  }
  started.wait();
  release.release(6);
  EXPECT_TRUE(waitUntil([&] { return pool.threadCount() == 2; }));
}

TEST(PoolTest, TasksMayPostTasks) {
  std::atomic<int> ran = 0;
  {
    Pool pool(2);
    pool.post([&] {
      ++ran;
      pool.post([&] { ++ran; });
    });
  }
  EXPECT_EQ(ran, 2);
}

}  // namespace
}  // namespace brivo
