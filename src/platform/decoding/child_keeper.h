// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <future>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "platform/base/mutex.h"
#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// Starts programs and reaps them, all on one thread of its own: a child that asks to die with its parent
/// (PR_SET_PDEATHSIG) dies with the thread that started it, and callers' threads come and go. *Thread-safe.*
class ChildKeeper {
 public:
  /// How long children that were killed have to be gone before the keeper goes without them.
  static constexpr std::chrono::milliseconds kDyingTime{1000};

  ChildKeeper();
  /// The children must have been killed.
  ~ChildKeeper();
  ChildKeeper(const ChildKeeper&) = delete;
  ChildKeeper& operator=(const ChildKeeper&) = delete;

  /// Starts `program` in a session of its own, with default signals, the service's standard error as
  /// descriptors 0 to 2, `socket` as kWorkerSocket, and no other descriptor nor environment. Waits until it
  /// is started, not until it is ready. The result refers to the process (pidfd_open(2)), which is reaped by
  /// itself when it ends.
  Result<UniqueFd> start(const std::string& program, UniqueFd socket) BRIVO_EXCLUDES(mutex_);

 private:
  struct Order {
    std::string program;
    UniqueFd socket;
    std::promise<Result<UniqueFd>> child;
  };

  void run();
  /// Sleeps until an order comes, a child ends, or `timeout` (milliseconds, -1: none) is over.
  void wait(int timeout);
  void takeOrders() BRIVO_EXCLUDES(mutex_);
  Result<UniqueFd> startNow(const std::string& program, const UniqueFd& socket);
  void reap();
  void awaitDeaths();
  bool isEnding() const BRIVO_EXCLUDES(mutex_);

  const UniqueFd wake_;
  std::vector<UniqueFd> children_;  // of the thread

  mutable Mutex mutex_;
  std::vector<Order> orders_ BRIVO_GUARDED_BY(mutex_);
  bool ending_ BRIVO_GUARDED_BY(mutex_) = false;

  std::thread thread_;  // last: uses everything above
};

}  // namespace brivo
