// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>

#include "platform/base/mutex.h"

namespace brivo {

/// A lock of one 32-bit word, for objects of which there are very many. Not recursive, not fair.
/// *Thread-safe.*
class BRIVO_THREAD_ANNOTATION(capability("mutex")) UnfairLock {
 public:
  void lock() BRIVO_THREAD_ANNOTATION(acquire_capability()) {
    while (word_.exchange(1, std::memory_order_acquire) != 0) word_.wait(1, std::memory_order_relaxed);
  }
  void unlock() BRIVO_THREAD_ANNOTATION(release_capability()) {
    word_.store(0, std::memory_order_release);
    word_.notify_one();
  }

 private:
  std::atomic<int> word_ = 0;
};

/// Holds an UnfairLock for its own lifetime. *Thread-bound.*
class BRIVO_THREAD_ANNOTATION(scoped_lockable) UnfairLockGuard {
 public:
  explicit UnfairLockGuard(UnfairLock& lock) BRIVO_THREAD_ANNOTATION(acquire_capability(lock)) : lock_(lock) {
    lock_.lock();
  }
  ~UnfairLockGuard() BRIVO_THREAD_ANNOTATION(release_capability()) { lock_.unlock(); }
  UnfairLockGuard(const UnfairLockGuard&) = delete;
  UnfairLockGuard& operator=(const UnfairLockGuard&) = delete;

 private:
  UnfairLock& lock_;
};

}  // namespace brivo
