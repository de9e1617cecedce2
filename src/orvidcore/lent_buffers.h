// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <optional>
#include <vector>

#include "platform/base/mapping.h"
#include "platform/base/mutex.h"
#include "platform/base/shared_buffer.h"

namespace orvid {

/// Memory of ours that the service may write into, and our view of it.
struct LentBuffer {
  brivo::SharedBuffer shared;
  brivo::Mapping mapping;
};

/// The buffers of one connection, used again and again: the service knows them, and their pages are there.
/// *Thread-safe.*
class LentBuffers {
 public:
  static constexpr std::size_t kSize = 2'097'152;

  /// None when memory or descriptors run out.
  std::optional<LentBuffer> take() BRIVO_EXCLUDES(mutex_);
  /// For a buffer that no call under way may still be written into.
  void giveBack(LentBuffer buffer) BRIVO_EXCLUDES(mutex_);

 private:
  static constexpr std::size_t kMostKept = 8;

  brivo::Mutex mutex_;
  std::vector<LentBuffer> free_ BRIVO_GUARDED_BY(mutex_);
};

}  // namespace orvid
