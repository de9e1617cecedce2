// SPDX-License-Identifier: MIT
// The serial queue with priorities on which a device serves its requests.
#pragma once

#include <condition_variable>
#include <deque>
#include <string>
#include <thread>

#include "platform/base/mutex.h"
#include "platform/work/task.h"

namespace brivo {

/// Runs operations one at a time on a thread of its own: high priority before normal, in the order
/// of adding among equals; a running operation is never interrupted. A thread of its own, because
/// operations read from a card that may block for long. *Thread-safe.*
class OperationQueue {
 public:
  enum class Priority { normal, high };

  /// `name` names the thread.
  explicit OperationQueue(std::string name);
  /// Cancels what waits and waits for what runs. Must not be called by an operation of this queue.
  ~OperationQueue();
  OperationQueue(const OperationQueue&) = delete;
  OperationQueue& operator=(const OperationQueue&) = delete;

  const std::string& name() const { return name_; }

  void addOperation(Task operation, Priority priority) BRIVO_EXCLUDES(mutex_);
  /// Drops the operations that have not started, without running them.
  void cancelAllOperations() BRIVO_EXCLUDES(mutex_);
  /// Returns when nothing runs and nothing waits. Must not be called by an operation of this queue.
  void waitUntilAllOperationsAreFinished() BRIVO_EXCLUDES(mutex_);
  /// True on the thread that runs the operations.
  bool isCurrent() const { return std::this_thread::get_id() == thread_.get_id(); }

 private:
  void work() BRIVO_EXCLUDES(mutex_);

  const std::string name_;

  Mutex mutex_;
  std::condition_variable_any changed_;
  std::deque<Task> high_ BRIVO_GUARDED_BY(mutex_);
  std::deque<Task> normal_ BRIVO_GUARDED_BY(mutex_);
  bool running_ BRIVO_GUARDED_BY(mutex_) = false;
  bool ending_ BRIVO_GUARDED_BY(mutex_) = false;

  std::thread thread_;  // last: uses everything above
};

}  // namespace brivo
