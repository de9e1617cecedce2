// SPDX-License-Identifier: MIT
#pragma once

#include "io/buffer_cache.h"
#include "platform/base/data.h"
#include "platform/base/memory_pool.h"

namespace brivo {

/// Reads pieces of files into the memory that travels to clients. *Thread-safe.*
class ReadMemory {
 public:
  /// Pieces of up to `usual` bytes are read into memory that is used again when the client is done with it.
  explicit ReadMemory(std::size_t usual)
      : usual_(usual), pool_(MemoryPool::create("brivod-read", usual, 2)) {}

  /// The `length` bytes of `file` from `offset` on, fewer when the medium gives fewer; empty when it gives
  /// none or memory runs out.
  Data read(const ReadAheadSource& file, std::uint64_t offset, std::size_t length);
  /// Frees what would be used again.
  void trim() { pool_->trim(); }

 private:
  const std::size_t usual_;
  const std::shared_ptr<MemoryPool> pool_;
};

}  // namespace brivo
