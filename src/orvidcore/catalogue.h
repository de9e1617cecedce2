// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <map>
#include <optional>
#include <vector>

#include "orvidcore/object.h"
#include "platform/base/mutex.h"

namespace orvid {

/// The objects of a device as they arrive. *Thread-safe.*
class Catalogue {
 public:
  /// A catalogue to which nothing is added for this long has settled.
  static constexpr std::chrono::seconds kQuietTime{1};

  /// The service has counted its objects.
  void ready(std::int32_t objectCount) BRIVO_EXCLUDES(mutex_);
  /// Serialised datasets; those that are no complete dataset are left out. What the rest say, with paths.
  std::vector<ObjectInfo> add(const brivo::Array& datasets) BRIVO_EXCLUDES(mutex_);
  void remove(std::uint32_t handle) BRIVO_EXCLUDES(mutex_);
  /// Nothing more will come.
  void close() BRIVO_EXCLUDES(mutex_);

  std::optional<ObjectInfo> find(std::uint32_t handle) const BRIVO_EXCLUDES(mutex_);
  /// Folders, then files, each in the order of their handles.
  std::vector<ObjectInfo> all() const BRIVO_EXCLUDES(mutex_);
  enum class Wait { settled, tooLong, closed };
  /// Waits until it has settled or was closed, at most for `timeout`.
  Wait waitUntilSettled(Timeout timeout) BRIVO_EXCLUDES(mutex_);

 private:
  using Clock = std::chrono::steady_clock;

  /// From the folders that have arrived by now; kept objects have none, because theirs may come later.
  std::string pathOf(const ObjectInfo& info) const BRIVO_REQUIRES(mutex_);
  ObjectInfo withPath(ObjectInfo info) const BRIVO_REQUIRES(mutex_);

  mutable brivo::Mutex mutex_;
  std::condition_variable_any changed_;
  std::map<std::uint32_t, ObjectInfo> objects_ BRIVO_GUARDED_BY(mutex_);
  std::optional<std::size_t> expected_ BRIVO_GUARDED_BY(mutex_);
  Clock::time_point lastArrival_ BRIVO_GUARDED_BY(mutex_);
  bool closed_ BRIVO_GUARDED_BY(mutex_) = false;
};

}  // namespace orvid
