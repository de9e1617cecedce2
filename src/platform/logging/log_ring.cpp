// SPDX-License-Identifier: MIT
#include "platform/logging/log_ring.h"

#include <fmt/format.h>

#include <utility>

#include "platform/work/thread_name.h"

namespace brivo {

namespace {

thread_local LogRing* currentRing = nullptr;

}  // namespace

LogRing::LogRing() : writer_([this] { writeLines(); }) { currentRing = this; }

LogRing::~LogRing() {
  currentRing = nullptr;
  {
    const MutexLock lock(mutex_);
    ending_ = true;
  }
  changed_.notify_all();
  writer_.join();
}

LogRing* LogRing::ofThisThread() { return currentRing; }

void LogRing::push(const UnifiedLog& log, LogLevel level, std::string line) {
  {
    const MutexLock lock(mutex_);
    if (lines_.size() >= kMostLines) {
      ++dropped_;
      return;
    }
    lines_.push_back({&log, level, std::move(line)});
  }
  changed_.notify_one();
}

void LogRing::writeLines() {
  setThreadName("log");
  mutex_.lock();
  while (true) {
    if (lines_.empty()) {
      if (ending_) break;
      changed_.wait(mutex_);
      continue;
    }
    const Line line = std::move(lines_.front());
    lines_.pop_front();
    const std::uint64_t dropped = lines_.empty() ? std::exchange(dropped_, 0) : 0;
    mutex_.unlock();
    line.log->writeNow(line.level, line.text);
    if (dropped > 0) {
      line.log->writeNow(LogLevel::error, fmt::format("{:>20} ! {} log lines dropped", "log", dropped));
    }
    mutex_.lock();
  }
  mutex_.unlock();
}

}  // namespace brivo
