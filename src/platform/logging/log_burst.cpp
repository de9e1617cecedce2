// SPDX-License-Identifier: MIT
#include "platform/logging/log_burst.h"

#include "platform/logging/standard_error.h"

namespace brivo {

namespace {

constexpr std::chrono::milliseconds kLongestWait{10};
constexpr std::size_t kMostBytes = 32'768;

thread_local LogBurst* burst = nullptr;

}  // namespace

LogBurst::LogBurst() { burst = this; }

LogBurst::~LogBurst() {
  burst = nullptr;
  write();
}

LogBurst* LogBurst::ofThisThread() { return burst; }

void LogBurst::add(std::string_view line, bool now) {
  lines_ += line;
  if (now || lines_.size() >= kMostBytes || std::chrono::steady_clock::now() - lastWriting_ > kLongestWait)
    write();
}

void LogBurst::write() {
  writeToStandardError(lines_);
  lines_.clear();
  lastWriting_ = std::chrono::steady_clock::now();
}

}  // namespace brivo
