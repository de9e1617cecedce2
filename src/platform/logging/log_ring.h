// SPDX-License-Identifier: MIT
#pragma once

#include <condition_variable>
#include <cstdint>
#include <deque>
#include <string>
#include <thread>

#include "platform/base/mutex.h"
#include "platform/logging/unified_log.h"

namespace brivo {

/// While it lives, log lines of the thread that made it go through a bounded queue to a thread that
/// writes them, so that the maker never blocks on a reader of the log. When the queue is full,
/// lines are dropped and counted, and the count is logged. *Thread-bound* to its maker.
class LogRing {
 public:
  static constexpr std::size_t kMostLines = 4096;

  LogRing();
  /// Writes what is queued.
  ~LogRing();
  LogRing(const LogRing&) = delete;
  LogRing& operator=(const LogRing&) = delete;

  /// The ring of the calling thread, or null.
  static LogRing* ofThisThread();

  /// `log` must outlive the ring.
  void push(const UnifiedLog& log, LogLevel level, std::string line) BRIVO_EXCLUDES(mutex_);

 private:
  struct Line {
    const UnifiedLog* log;
    LogLevel level;
    std::string text;
  };

  void writeLines() BRIVO_EXCLUDES(mutex_);

  Mutex mutex_;
  std::condition_variable_any changed_;
  std::deque<Line> lines_ BRIVO_GUARDED_BY(mutex_);
  std::uint64_t dropped_ BRIVO_GUARDED_BY(mutex_) = 0;
  bool ending_ BRIVO_GUARDED_BY(mutex_) = false;

  std::thread writer_;  // last: uses everything above
};

}  // namespace brivo
