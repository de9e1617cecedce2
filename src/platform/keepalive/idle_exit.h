// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <functional>
#include <memory>

#include "platform/keepalive/transactions.h"
#include "platform/work/run_loop.h"

namespace brivo {

/// Ends the run loop of a process that was started on demand when nothing has kept it for a while.
/// *Thread-bound* to the loop.
class IdleExit {
 public:
  /// Says whether the process may go right now; it must not take on new clients after "yes".
  using LastCheck = std::function<void(std::function<void(bool)> answer)>;

  /// Quits `loop` after `idleTime` without a transaction, once `lastCheck` agrees; its answer may come on any
  /// thread. All must outlive this.
  IdleExit(RunLoop& loop, Transactions& transactions, std::chrono::seconds idleTime, LastCheck lastCheck);

 private:
  struct State;
  std::shared_ptr<State> state_;
};

}  // namespace brivo
