// SPDX-License-Identifier: MIT
// A mutex that clang's thread-safety analysis understands, and the annotations that go with it.
#pragma once

#include <mutex>

#if defined(__clang__)
#define BRIVO_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define BRIVO_THREAD_ANNOTATION(x)
#endif

/// The member may only be touched while `m` is held.
#define BRIVO_GUARDED_BY(m) BRIVO_THREAD_ANNOTATION(guarded_by(m))
/// The function may only be called while the named mutexes are held.
#define BRIVO_REQUIRES(...) BRIVO_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
/// The function may only be called while the named mutexes are not held.
#define BRIVO_EXCLUDES(...) BRIVO_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))

namespace brivo {

/// Not recursive, not fair. *Thread-safe.*
class BRIVO_THREAD_ANNOTATION(capability("mutex")) Mutex {
 public:
  Mutex() = default;
  Mutex(const Mutex&) = delete;
  Mutex& operator=(const Mutex&) = delete;

  // Lower case, so that std::condition_variable_any takes it.
  void lock() BRIVO_THREAD_ANNOTATION(acquire_capability()) { mutex_.lock(); }
  void unlock() BRIVO_THREAD_ANNOTATION(release_capability()) { mutex_.unlock(); }

 private:
  std::mutex mutex_;
};

/// Holds a Mutex for its own lifetime. *Thread-bound.*
class BRIVO_THREAD_ANNOTATION(scoped_lockable) MutexLock {
 public:
  explicit MutexLock(Mutex& mutex) BRIVO_THREAD_ANNOTATION(acquire_capability(mutex)) : mutex_(mutex) {
    mutex_.lock();
  }
  ~MutexLock() BRIVO_THREAD_ANNOTATION(release_capability()) { mutex_.unlock(); }
  MutexLock(const MutexLock&) = delete;
  MutexLock& operator=(const MutexLock&) = delete;

 private:
  Mutex& mutex_;
};

}  // namespace brivo
