// SPDX-License-Identifier: MIT
#pragma once

#include <deque>
#include <memory>

#include "platform/base/mutex.h"
#include "platform/work/pool.h"
#include "platform/work/task.h"

namespace brivo {

/// A share of the pool: runs its tasks in the order of posting, at most `width` of them at once.
/// Work of one card goes through one lane, so that a card that does not answer holds that many
/// threads and no more. *Thread-safe.*
class Lane : public std::enable_shared_from_this<Lane> {
 public:
  /// `pool` must outlive everything that is posted here.
  static std::shared_ptr<Lane> create(Pool& pool, std::size_t width);

  void post(Task task) BRIVO_EXCLUDES(mutex_);

 private:
  Lane(Pool& pool, std::size_t width) : pool_(pool), width_(width) {}
  void runNext() BRIVO_EXCLUDES(mutex_);

  Pool& pool_;
  const std::size_t width_;
  Mutex mutex_;
  std::deque<Task> tasks_ BRIVO_GUARDED_BY(mutex_);
  std::size_t running_ BRIVO_GUARDED_BY(mutex_) = 0;
};

}  // namespace brivo
