// SPDX-License-Identifier: MIT
#include "platform/work/operation_queue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <semaphore>
#include <string>

namespace brivo {
namespace {

using Priority = OperationQueue::Priority;

/// A queue whose first operation waits, so that what is added next is all waiting at once.
class OperationQueueTest : public testing::Test {
 protected:
  void hold() {
    queue_.addOperation(
        [this] {
          running_.release();
          gate_.acquire();
        },
        Priority::normal);
    running_.acquire();
  }
  void add(char name, Priority priority) {
    queue_.addOperation([this, name] { order_ += name; }, priority);
  }

  std::string order_;
  std::binary_semaphore running_{0};
  std::binary_semaphore gate_{0};
  OperationQueue queue_{"test"};
};

TEST_F(OperationQueueTest, HighBeforeNormalAndFirstInFirstOutAmongEquals) {
  hold();
  add('a', Priority::normal);
  add('B', Priority::high);
  add('c', Priority::normal);
  add('D', Priority::high);
  gate_.release();
  queue_.waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order_, "BDac");
}

TEST_F(OperationQueueTest, ARunningOperationIsNeverInterrupted) {
  hold();
  add('H', Priority::high);
  queue_.addOperation([] {}, Priority::high);
  EXPECT_EQ(order_, "") << "the normal operation that runs goes on";
  gate_.release();
  queue_.waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order_, "H");
}

TEST_F(OperationQueueTest, CancelAllDropsWhatWaitsAndKeepsWhatRuns) {
  hold();
  const auto owned = std::make_shared<int>(1);
  queue_.addOperation([this, owned] { order_ += 'x'; }, Priority::high);
  queue_.cancelAllOperations();
  EXPECT_EQ(owned.use_count(), 1) << "a cancelled operation lets go of what it owns";
  gate_.release();
  queue_.waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order_, "");
}

TEST(OperationQueueLifeTest, TheDestructorCancelsAndWaits) {
  std::atomic<bool> finished = false;
  std::atomic<bool> cancelledRan = false;
  std::binary_semaphore running(0);
  std::binary_semaphore gate(0);
  {
    OperationQueue queue("test");
    queue.addOperation(
        [&] {
          running.release();
          gate.acquire();
          finished = true;
        },
        Priority::normal);
    running.acquire();
    queue.addOperation([&] { cancelledRan = true; }, Priority::high);
    queue.cancelAllOperations();
    gate.release();
  }
  EXPECT_TRUE(finished);
  EXPECT_FALSE(cancelledRan);
}

TEST(OperationQueueLifeTest, WaitingOnAnIdleQueueReturns) {
  OperationQueue queue("test");
  queue.waitUntilAllOperationsAreFinished();
  EXPECT_FALSE(queue.isCurrent());
}

}  // namespace
}  // namespace brivo
