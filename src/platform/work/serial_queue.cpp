// SPDX-License-Identifier: MIT
#include "platform/work/serial_queue.h"

#include <semaphore>

namespace brivo {

namespace {

thread_local const SerialQueue* current = nullptr;

}  // namespace

std::shared_ptr<SerialQueue> SerialQueue::create(Pool& pool) {
  return std::shared_ptr<SerialQueue>(new SerialQueue(pool));
}

void SerialQueue::post(Task task) {
  bool wasIdle = false;
  {
    const MutexLock lock(mutex_);
    wasIdle = !tasks_;
    if (wasIdle) tasks_ = std::make_unique<std::deque<Task>>();
    tasks_->push_back(std::move(task));
  }
  if (wasIdle) schedule();
}

void SerialQueue::runAndWait(const Task& task) {
  std::binary_semaphore done(0);
  post([&] {
    task();
    done.release();
  });
  done.acquire();
}

bool SerialQueue::runsHere() const { return current == this; }

void SerialQueue::schedule() {
  pool_.post([self = shared_from_this()] { self->drain(); });
}

void SerialQueue::drain() {
  constexpr int kTasksPerTurn = 16;
  for (int i = 0; i < kTasksPerTurn; ++i) {
    Task task;
    {
      const MutexLock lock(mutex_);
      if (tasks_->empty()) {
        tasks_.reset();
        return;
      }
      task = std::move(tasks_->front());
      tasks_->pop_front();
    }
    current = this;
    task();
    current = nullptr;
  }
  schedule();
}

}  // namespace brivo
