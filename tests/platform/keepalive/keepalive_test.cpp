// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <functional>
#include <vector>

#include "platform/keepalive/idle_exit.h"
#include "platform/keepalive/transactions.h"

namespace brivo {
namespace {

using namespace std::chrono_literals;

/// Runs `task` on the loop as soon as `condition` holds.
void when(RunLoop& loop, const std::function<bool()>& condition, const std::function<void()>& task) {
  loop.postAfter(1ms, [&loop, condition, task] {
    if (condition()) return task();
    when(loop, condition, task);
  });
}

TEST(TransactionsTest, CountsWhatIsUnderWayAndTellsWhenNothingIs) {
  Transactions transactions;
  int told = 0;
  transactions.onNone([&] { ++told; });
  auto first = transactions.begin("00001");
  {
    const auto second = transactions.begin("00002");
    EXPECT_EQ(transactions.count(), 2u);
  }
  EXPECT_EQ(told, 0);
  first.reset();
  EXPECT_EQ(transactions.count(), 0u);
  EXPECT_EQ(told, 1);
}

TEST(TransactionsTest, ATransactionMayOutliveTheCount) {
  Transactions::Transaction held;
  {
    Transactions transactions;
    held = transactions.begin("x");
  }
  held.reset();
}

TEST(IdleExitTest, TheLoopEndsAfterTheIdleTime) {
  RunLoop loop;
  Transactions transactions;
  int checks = 0;
  const IdleExit exit(loop, transactions, 0s, [&](const auto& answer) {
    ++checks;
    answer(true);
  });
  loop.run();
  EXPECT_EQ(checks, 1);
}

TEST(IdleExitTest, ATransactionKeepsItAndTheLastCheckMayRefuse) {
  RunLoop loop;
  Transactions transactions;
  auto transaction = transactions.begin("x");
  int checks = 0;
  const IdleExit exit(loop, transactions, 0s, [&](const auto& answer) { answer(++checks == 2); });
  loop.postAfter(30ms, [&] {
    EXPECT_EQ(checks, 0);
    transaction.reset();
  });
  loop.run();
  EXPECT_EQ(checks, 2);
}

TEST(IdleExitTest, OneLastCheckIsMadeAtATime) {
  RunLoop loop;
  Transactions transactions;
  std::vector<std::function<void(bool)>> checks;
  const IdleExit exit(loop, transactions, 0s, [&](const auto& answer) { checks.push_back(answer); });
  const auto hasBeenAsked = [&](std::size_t times) { return [&, times] { return checks.size() >= times; }; };
  when(loop, hasBeenAsked(1), [&] {
    transactions.begin("x").reset();  // somebody who comes and goes during the check
    loop.postAfter(20ms, [&] {
      EXPECT_EQ(checks.size(), 1u);
      checks[0](false);
      when(loop, hasBeenAsked(2), [&] { checks[1](true); });
    });
  });
  loop.postAfter(20s, [&] { loop.quit(); });
  loop.run();
  EXPECT_EQ(checks.size(), 2u);
}

}  // namespace
}  // namespace brivo
