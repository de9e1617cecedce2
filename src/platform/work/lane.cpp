// SPDX-License-Identifier: MIT
#include "platform/work/lane.h"

namespace brivo {

std::shared_ptr<Lane> Lane::create(Pool& pool, std::size_t width) {
  return std::shared_ptr<Lane>(new Lane(pool, width));
}

void Lane::post(Task task) {
  {
    const MutexLock lock(mutex_);
    tasks_.push_back(std::move(task));
    if (running_ == width_) return;
    ++running_;
  }
  pool_.post([self = shared_from_this()] { self->runNext(); });
}

void Lane::runNext() {
  Task task;
  {
    const MutexLock lock(mutex_);
    if (tasks_.empty()) {
      --running_;
      return;
    }
    task = std::move(tasks_.front());
    tasks_.pop_front();
  }
  task();
  task = nullptr;
  pool_.post([self = shared_from_this()] { self->runNext(); });
}

}  // namespace brivo
