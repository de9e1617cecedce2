// SPDX-License-Identifier: MIT
// The threads that all concurrent and serial work of the process shares.
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <thread>

#include "platform/base/mutex.h"
#include "platform/work/task.h"

namespace brivo {

/// Runs posted tasks in the order of posting on a fixed number of threads, and on more while those
/// are stuck: when tasks wait and none has been started for kStallTime, a further thread joins, up
/// to kMostThreads. So tasks may wait (for a card that does not answer, for a database) without
/// starving the rest; threads that joined leave again after kSpareTime without work. *Thread-safe.*
class Pool {
 public:
  static constexpr std::chrono::milliseconds kStallTime{10};
  static constexpr std::chrono::seconds kSpareTime{1};
  static constexpr std::size_t kMostThreads = 128;

  /// One thread per core, at least two.
  static std::size_t defaultThreadCount();

  explicit Pool(std::size_t threads = defaultThreadCount());
  /// Runs what is still queued, then ends the threads. Must not be called from one of them.
  ~Pool();
  Pool(const Pool&) = delete;
  Pool& operator=(const Pool&) = delete;

  /// The pool that the calling thread belongs to, or null.
  static Pool* ofThisThread();

  /// Never blocks on running tasks. The task is destroyed on the thread that ran it.
  void post(Task task) BRIVO_EXCLUDES(mutex_);

  /// Returns at a moment at which no task runs and none waits. Must not be called from a task.
  void waitUntilIdle() BRIVO_EXCLUDES(mutex_);

  /// Threads that exist right now, the stuck ones among them.
  std::size_t threadCount() const BRIVO_EXCLUDES(mutex_);

 private:
  void addThread() BRIVO_REQUIRES(mutex_);
  void work() BRIVO_EXCLUDES(mutex_);
  /// Waits for something to do; false when a spare thread has waited long enough.
  bool waitForTask() BRIVO_REQUIRES(mutex_);
  /// Adds threads while the queue does not move.
  void supervise() BRIVO_EXCLUDES(mutex_);

  const std::size_t baseThreads_;

  mutable Mutex mutex_;
  std::condition_variable_any workers_;
  std::condition_variable_any supervisor_;
  std::condition_variable_any quieter_;  // a thread has become idle or has ended
  std::deque<Task> queue_ BRIVO_GUARDED_BY(mutex_);
  std::size_t threads_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::size_t idle_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::uint64_t started_ BRIVO_GUARDED_BY(mutex_) = 0;
  bool watching_ BRIVO_GUARDED_BY(mutex_) = false;  // the supervisor looks again soon by itself
  bool ending_ BRIVO_GUARDED_BY(mutex_) = false;

  std::thread supervisorThread_;  // last: uses everything above
};

}  // namespace brivo
