// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <deque>
#include <initializer_list>
#include <map>
#include <memory>

#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"
#include "platform/work/task.h"

struct sd_event;

namespace brivo {

/// One thread's event loop (sd-event): tasks from any thread in the order of posting, delayed
/// tasks, signals, and the event sources that platform services attach. Made on any thread, then
/// run by one.
class RunLoop {
 public:
  RunLoop();
  /// Tasks that have not run are dropped.
  ~RunLoop();
  RunLoop(const RunLoop&) = delete;
  RunLoop& operator=(const RunLoop&) = delete;

  /// Serves events until quit(), and drops what was posted and has not run by then, and what is posted later.
  /// The calling thread is the loop's thread from then on. Once only.
  void run();
  /// Makes run() return after the current task. *Thread-safe.*
  void quit();

  /// Runs `task` on a later pass of the loop, never at once. *Thread-safe.*
  void post(Task task) BRIVO_EXCLUDES(mutex_);
  /// The same after `delay` at the earliest. *Thread-safe.*
  void postAfter(std::chrono::milliseconds delay, Task task);
  /// Runs `task` whenever one of `signals` arrives. The signals must be blocked in every thread:
  /// call it before the first thread is started. Loop thread or before run().
  void onSignals(std::initializer_list<int> signals, const Task& task);

  /// The loop itself, for services that attach sources to it on its thread; borrowed.
  sd_event* event() const { return event_; }

 private:
  struct Watch;

  void runPosted() BRIVO_EXCLUDES(mutex_);
  void startTimer(std::chrono::milliseconds delay, Task task);

  sd_event* event_ = nullptr;
  UniqueFd wake_;
  std::map<const Watch*, std::unique_ptr<Watch>> watches_;  // loop thread

  Mutex mutex_;
  std::deque<Task> posted_ BRIVO_GUARDED_BY(mutex_);
  bool ended_ BRIVO_GUARDED_BY(mutex_) = false;
};

}  // namespace brivo
