// SPDX-License-Identifier: MIT
#include "platform/work/operation_queue.h"

#include <cassert>

#include "platform/work/thread_name.h"

namespace brivo {

OperationQueue::OperationQueue(std::string name) : name_(std::move(name)), thread_([this] { work(); }) {}

OperationQueue::~OperationQueue() {
  cancelAllOperations();
  {
    const MutexLock lock(mutex_);
    ending_ = true;
  }
  changed_.notify_all();
  thread_.join();
}

void OperationQueue::addOperation(Task operation, Priority priority) {
  {
    const MutexLock lock(mutex_);
    (priority == Priority::high ? high_ : normal_).push_back(std::move(operation));
  }
  changed_.notify_all();
}

void OperationQueue::cancelAllOperations() {
  std::deque<Task> high;  // the operations end outside the lock: they may own anything
  std::deque<Task> normal;
  {
    const MutexLock lock(mutex_);
    high.swap(high_);
    normal.swap(normal_);
  }
  changed_.notify_all();
}

void OperationQueue::waitUntilAllOperationsAreFinished() {
  assert(!isCurrent());
  mutex_.lock();
  while (running_ || !high_.empty() || !normal_.empty()) changed_.wait(mutex_);
  mutex_.unlock();
}

void OperationQueue::work() {
  setThreadName(name_.c_str());
  mutex_.lock();
  while (true) {
    std::deque<Task>& next = high_.empty() ? normal_ : high_;
    if (next.empty()) {
      if (ending_) break;
      changed_.wait(mutex_);
      continue;
    }
    Task operation = std::move(next.front());
    next.pop_front();
    running_ = true;
    mutex_.unlock();
    operation();
    operation = nullptr;
    mutex_.lock();
    running_ = false;
    changed_.notify_all();
  }
  mutex_.unlock();
}

}  // namespace brivo
