// SPDX-License-Identifier: MIT
#include "imaging/allocation_limit.h"

extern "C" {
#include <libavutil/mem.h>
}

#include <limits>
#include <set>

#include "platform/base/mutex.h"

namespace brivo::imaging {

namespace {

/// The library has one limit for the whole process, and does not tell it.
class Limits {
 public:
  void add(std::size_t limit) BRIVO_EXCLUDES(mutex_) {
    const MutexLock lock(mutex_);
    limits_.insert(limit);
    apply();
  }
  void remove(std::size_t limit) BRIVO_EXCLUDES(mutex_) {
    const MutexLock lock(mutex_);
    limits_.erase(limits_.find(limit));
    apply();
  }

 private:
  void apply() BRIVO_REQUIRES(mutex_) {
    constexpr std::size_t kLimitOfTheLibrary = std::numeric_limits<int>::max();
    av_max_alloc(limits_.empty() ? kLimitOfTheLibrary : *limits_.begin());
  }

  Mutex mutex_;
  std::multiset<std::size_t> limits_ BRIVO_GUARDED_BY(mutex_);
};

Limits& limits() {
  static Limits instance;
  return instance;
}

}  // namespace

AllocationLimit::AllocationLimit(std::size_t mostAtOnce) : mostAtOnce_(mostAtOnce) {
  limits().add(mostAtOnce_);
}

AllocationLimit::~AllocationLimit() { limits().remove(mostAtOnce_); }

}  // namespace brivo::imaging
