// SPDX-License-Identifier: MIT
#include "platform/work/run_loop.h"

#include <sys/eventfd.h>
#include <systemd/sd-event.h>
#include <unistd.h>

#include <csignal>
#include <cstdint>
#include <system_error>

namespace brivo {

namespace {

void check(int result, const char* what) {
  if (result < 0) throw std::system_error(-result, std::generic_category(), what);
}

}  // namespace

/// One timer or signal of the loop.
struct RunLoop::Watch {
  Watch(RunLoop& owner, Task toRun) : loop(owner), task(std::move(toRun)) {}
  ~Watch() { sd_event_source_disable_unref(source); }
  Watch(const Watch&) = delete;
  Watch& operator=(const Watch&) = delete;

  RunLoop& loop;
  Task task;
  sd_event_source* source = nullptr;
};

// A process that cannot have an event loop cannot start: the only place that throws.
RunLoop::RunLoop() : wake_(::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  check(wake_ ? 0 : -errno, "eventfd");
  check(sd_event_new(&event_), "sd_event_new");
  const auto onWake = [](sd_event_source*, int fd, std::uint32_t, void* self) {
    std::uint64_t count = 0;
    (void)!::read(fd, &count, sizeof count);
    static_cast<RunLoop*>(self)->runPosted();
    return 0;
  };
  check(sd_event_add_io(event_, nullptr, wake_.get(), EPOLLIN, onWake, this), "sd_event_add_io");
}

RunLoop::~RunLoop() {
  watches_.clear();
  sd_event_unref(event_);
}

void RunLoop::run() {
  sd_event_loop(event_);
  watches_.clear();
  std::deque<Task> dropped;
  const MutexLock lock(mutex_);
  ended_ = true;
  dropped.swap(posted_);
}

void RunLoop::quit() {
  post([this] { sd_event_exit(event_, 0); });
}

void RunLoop::post(Task task) {
  bool wasEmpty = false;
  {
    const MutexLock lock(mutex_);
    if (ended_) return;
    wasEmpty = posted_.empty();
    posted_.push_back(std::move(task));
  }
  if (wasEmpty) {
    constexpr std::uint64_t one = 1;
    (void)!::write(wake_.get(), &one, sizeof one);
  }
}

void RunLoop::postAfter(std::chrono::milliseconds delay, Task task) {
  post([this, delay, task = std::move(task)]() mutable { startTimer(delay, std::move(task)); });
}

void RunLoop::startTimer(std::chrono::milliseconds delay, Task task) {
  auto watch = std::make_unique<Watch>(*this, std::move(task));
  const auto onTime = [](sd_event_source*, std::uint64_t, void* userdata) {
    auto* due = static_cast<Watch*>(userdata);
    const Task dueTask = std::move(due->task);
    due->loop.watches_.erase(due);
    dueTask();
    return 0;
  };
  const auto microseconds = static_cast<std::uint64_t>(std::chrono::microseconds(delay).count());
  if (sd_event_add_time_relative(event_, &watch->source, CLOCK_MONOTONIC, microseconds, 1, onTime,
                                 watch.get()) < 0) {
    return;
  }
  watches_.emplace(watch.get(), std::move(watch));
}

void RunLoop::onSignals(std::initializer_list<int> signals, const Task& task) {
  for (const int signal : signals) {
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, signal);
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
    auto watch = std::make_unique<Watch>(*this, task);
    const auto onSignal = [](sd_event_source*, const signalfd_siginfo*, void* userdata) {
      static_cast<Watch*>(userdata)->task();
      return 0;
    };
    check(sd_event_add_signal(event_, &watch->source, signal, onSignal, watch.get()), "sd_event_add_signal");
    watches_.emplace(watch.get(), std::move(watch));
  }
}

void RunLoop::runPosted() {
  std::deque<Task> batch;
  {
    const MutexLock lock(mutex_);
    batch.swap(posted_);
  }
  for (const Task& task : batch) task();
}

}  // namespace brivo
