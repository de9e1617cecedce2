// SPDX-License-Identifier: MIT
#include "platform/keepalive/idle_exit.h"

#include <utility>

namespace brivo {

struct IdleExit::State : std::enable_shared_from_this<State> {
  State(RunLoop& owner, Transactions& counted, std::chrono::seconds time, LastCheck check)
      : loop(owner), transactions(counted), idleTime(time), lastCheck(std::move(check)) {}

  /// Any thread.
  void becameIdle() {
    loop.post([weak = weak_from_this()] {
      if (const auto self = weak.lock()) self->startWaiting();
    });
  }

  void startWaiting() {
    loop.postAfter(idleTime, [weak = weak_from_this(), wait = ++waits] {
      if (const auto self = weak.lock()) self->waited(wait);
    });
  }

  void waited(std::uint64_t wait) {
    // A later wait counts, or somebody came, or is asked about already.
    if (wait != waits || checking || transactions.count() > 0) return;
    checking = true;
    lastCheck([weak = weak_from_this()](bool idle) {
      const auto self = weak.lock();
      if (!self) return;
      self->loop.post([weak, idle] {
        if (const auto state = weak.lock()) state->checked(idle);
      });
    });
  }

  void checked(bool idle) {
    checking = false;
    if (idle) {
      loop.quit();
    } else {
      startWaiting();
    }
  }

  RunLoop& loop;
  Transactions& transactions;
  const std::chrono::seconds idleTime;
  const LastCheck lastCheck;
  std::uint64_t waits = 0;
  bool checking = false;
};

IdleExit::IdleExit(RunLoop& loop, Transactions& transactions, std::chrono::seconds idleTime,
                   LastCheck lastCheck)
    : state_(std::make_shared<State>(loop, transactions, idleTime, std::move(lastCheck))) {
  transactions.onNone([weak = std::weak_ptr(state_)] {
    if (const auto state = weak.lock()) state->becameIdle();
  });
  state_->becameIdle();
}

}  // namespace brivo
