// SPDX-License-Identifier: MIT
#include "platform/work/run_loop.h"

#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <memory>
#include <thread>
#include <vector>

namespace brivo {
namespace {

using namespace std::chrono_literals;

TEST(RunLoopTest, RunsTasksFromOtherThreadsInOrder) {
  RunLoop loop;
  std::vector<int> order;
  std::thread poster([&] {
    for (int i = 0; i < 1000; ++i) loop.post([&, i] { order.push_back(i); });
    loop.quit();
  });
  loop.run();
  poster.join();
  ASSERT_EQ(order.size(), 1000u);
  EXPECT_TRUE(std::is_sorted(order.begin(), order.end()));
}

TEST(RunLoopTest, APostFromATaskRunsOnALaterPass) {
  RunLoop loop;
  std::string order;
  loop.post([&] {
    loop.post([&] {
      order += 'b';
      loop.quit();
    });
    order += 'a';
  });
  loop.run();
  EXPECT_EQ(order, "ab");
}

TEST(RunLoopTest, DelayedTasksRunWhenDue) {
  RunLoop loop;
  std::string order;
  loop.postAfter(30ms, [&] {
    order += 'c';
    loop.quit();
  });
  loop.postAfter(10ms, [&] { order += 'b'; });
  loop.post([&] { order += 'a'; });
  loop.run();
  EXPECT_EQ(order, "abc");
}

TEST(RunLoopTest, TasksThatNeverRanAreReleased) {
  const auto owned = std::make_shared<int>(1);
  {
    RunLoop loop;
    loop.postAfter(1h, [owned] {});
    loop.post([&] { loop.quit(); });
    loop.run();
    loop.post([owned] {});
    loop.postAfter(1h, [owned] {});
  }
  EXPECT_EQ(owned.use_count(), 1);
}

TEST(RunLoopTest, ASignalRunsItsTask) {
  RunLoop loop;
  loop.onSignals({SIGUSR1}, [&] { loop.quit(); });
  loop.post([] { ::raise(SIGUSR1); });
  loop.run();
}

}  // namespace
}  // namespace brivo
