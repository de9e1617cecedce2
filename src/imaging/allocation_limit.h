// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>

namespace brivo::imaging {

/// While it lives, no allocation of FFmpeg's libraries in this process is of more bytes: they believe the
/// counts of a file. Of several limits at once, on whatever threads, the lowest holds. *Thread-safe.*
class AllocationLimit {
 public:
  explicit AllocationLimit(std::size_t mostAtOnce);
  ~AllocationLimit();
  AllocationLimit(const AllocationLimit&) = delete;
  AllocationLimit& operator=(const AllocationLimit&) = delete;

 private:
  const std::size_t mostAtOnce_;
};

}  // namespace brivo::imaging
