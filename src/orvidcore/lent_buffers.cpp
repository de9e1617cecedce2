// SPDX-License-Identifier: MIT
#include "orvidcore/lent_buffers.h"

namespace orvid {

std::optional<LentBuffer> LentBuffers::take() {
  {
    const brivo::MutexLock lock(mutex_);
    if (!free_.empty()) {
      LentBuffer buffer = std::move(free_.back());
      free_.pop_back();
      return buffer;
    }
  }
  auto shared = brivo::SharedBuffer::create("orvid-read", kSize);
  brivo::Mapping mapping = shared ? shared->mapped(kSize) : brivo::Mapping();
  if (!mapping) return std::nullopt;
  return LentBuffer{std::move(*shared), std::move(mapping)};
}

void LentBuffers::giveBack(LentBuffer buffer) {
  const brivo::MutexLock lock(mutex_);
  if (free_.size() < kMostKept) free_.push_back(std::move(buffer));
}

}  // namespace orvid
