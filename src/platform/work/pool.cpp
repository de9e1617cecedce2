// SPDX-License-Identifier: MIT
#include "platform/work/pool.h"

#include <algorithm>
#include <system_error>

#include "platform/work/thread_name.h"

namespace brivo {

namespace {

thread_local Pool* currentPool = nullptr;

}  // namespace

Pool* Pool::ofThisThread() { return currentPool; }

std::size_t Pool::defaultThreadCount() {
  return std::max<std::size_t>(2, std::thread::hardware_concurrency());
}

Pool::Pool(std::size_t threads) : baseThreads_(threads) {
  {
    const MutexLock lock(mutex_);
    while (threads_ < baseThreads_) addThread();
  }
  supervisorThread_ = std::thread([this] { supervise(); });
}

Pool::~Pool() {
  {
    const MutexLock lock(mutex_);
    ending_ = true;
  }
  workers_.notify_all();
  supervisor_.notify_all();
  supervisorThread_.join();
  mutex_.lock();
  while (threads_ > 0) quieter_.wait(mutex_);
  mutex_.unlock();
}

void Pool::post(Task task) {
  bool wakeWorker = false;
  bool wakeSupervisor = false;
  {
    const MutexLock lock(mutex_);
    queue_.push_back(std::move(task));
    wakeWorker = idle_ > 0;
    wakeSupervisor = queue_.size() > idle_ && !watching_;
  }
  if (wakeWorker) workers_.notify_one();
  if (wakeSupervisor) supervisor_.notify_one();
}

void Pool::waitUntilIdle() {
  mutex_.lock();
  while (!queue_.empty() || idle_ < threads_) quieter_.wait(mutex_);
  mutex_.unlock();
}

std::size_t Pool::threadCount() const {
  const MutexLock lock(mutex_);
  return threads_;
}

void Pool::addThread() {
  // Detached, and counted instead of kept: a spare thread may leave at any time.
  std::thread([this] { work(); }).detach();
  ++threads_;
}

void Pool::work() {
  setThreadName("pool");
  currentPool = this;
  mutex_.lock();
  while (true) {
    if (!queue_.empty()) {
      Task task = std::move(queue_.front());
      queue_.pop_front();
      ++started_;
      mutex_.unlock();
      task();
      task = nullptr;
      mutex_.lock();
    } else if (ending_ || !waitForTask()) {
      break;
    }
  }
  --threads_;
  quieter_.notify_all();
  mutex_.unlock();
}

bool Pool::waitForTask() {
  ++idle_;
  quieter_.notify_all();
  bool stay = true;
  if (threads_ <= baseThreads_) {
    workers_.wait(mutex_);
  } else if (workers_.wait_for(mutex_, kSpareTime) == std::cv_status::timeout) {
    stay = !queue_.empty() || threads_ <= baseThreads_;
  }
  --idle_;
  return stay;
}

void Pool::supervise() {
  setThreadName("pool-supervisor");
  mutex_.lock();
  while (!ending_ || !queue_.empty()) {
    if (queue_.empty()) {
      supervisor_.wait(mutex_);
      continue;
    }
    const std::uint64_t startedBefore = started_;
    watching_ = true;
    supervisor_.wait_for(mutex_, kStallTime);
    watching_ = false;
    const bool stuck = !queue_.empty() && started_ == startedBefore && idle_ == 0;
    if (!stuck || threads_ >= kMostThreads) continue;
    try {
      addThread();
    } catch (const std::system_error&) {
      // No more threads to be had: the queue moves again when a task ends.
    }
  }
  mutex_.unlock();
}

}  // namespace brivo
