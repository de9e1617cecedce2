// SPDX-License-Identifier: MIT
#include "platform/work/serial_queue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <semaphore>
#include <vector>

namespace brivo {
namespace {

TEST(SerialQueueTest, RunsInOrderAndOneAtATime) {
  std::vector<int> order;  // unguarded: the queue is what serialises
  {
    Pool pool(4);
    const auto queue = SerialQueue::create(pool);
    for (int i = 0; i < 5000; ++i) queue->post([&, i] { order.push_back(i); });
  }
  ASSERT_EQ(order.size(), 5000u);
  for (int i = 0; i < 5000; ++i) ASSERT_EQ(order[static_cast<std::size_t>(i)], i);
}

TEST(SerialQueueTest, RunAndWaitReturnsAfterTheTask) {
  Pool pool(2);
  const auto queue = SerialQueue::create(pool);
  bool ran = false;
  queue->runAndWait([&] { ran = true; });
  EXPECT_TRUE(ran);
}

TEST(SerialQueueTest, WhatIsQueuedRunsAfterTheLastReferenceIsGone) {
  std::atomic<int> ran = 0;
  {
    Pool pool(2);
    auto queue = SerialQueue::create(pool);
    for (int i = 0; i < 100; ++i) queue->post([&] { ++ran; });
    queue.reset();
  }
  EXPECT_EQ(ran, 100);
}

TEST(SerialQueueTest, ALongQueueDoesNotHoldUpAnother) {
  Pool pool(1);
  const auto busy = SerialQueue::create(pool);
  const auto other = SerialQueue::create(pool);
  std::atomic<int> done = 0;
  std::atomic<int> doneBeforeOther = -1;
  std::binary_semaphore gate(0);
  busy->post([&] { gate.acquire(); });
  for (int i = 0; i < 1000; ++i) busy->post([&] { ++done; });
  other->post([&] { doneBeforeOther = done.load(); });
  gate.release();
  other->runAndWait([] {});
  EXPECT_LT(doneBeforeOther, 1000);
}

}  // namespace
}  // namespace brivo
