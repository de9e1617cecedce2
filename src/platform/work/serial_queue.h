// SPDX-License-Identifier: MIT
#pragma once

#include <deque>
#include <memory>
#include <string>

#include "platform/base/mutex.h"
#include "platform/work/pool.h"
#include "platform/work/task.h"

namespace brivo {

/// Runs its tasks one at a time in the order of posting, on threads of the pool. Costs no thread
/// and next to no memory while it is idle. What is queued runs even when the last reference goes.
/// *Thread-safe.*
class SerialQueue : public std::enable_shared_from_this<SerialQueue> {
 public:
  /// `pool` must outlive everything that is posted here.
  static std::shared_ptr<SerialQueue> create(Pool& pool);

  void post(Task task) BRIVO_EXCLUDES(mutex_);
  /// Runs `task` here and returns when it has run. Must not be called from a task of this queue.
  void runAndWait(const Task& task);
  /// True for a task of this queue.
  bool runsHere() const;

 private:
  explicit SerialQueue(Pool& pool) : pool_(pool) {}
  /// Runs a few tasks, then makes room for other queues.
  void drain() BRIVO_EXCLUDES(mutex_);
  void schedule();

  Pool& pool_;
  Mutex mutex_;
  std::unique_ptr<std::deque<Task>> tasks_ BRIVO_GUARDED_BY(mutex_);  // none while idle
};

}  // namespace brivo
