// SPDX-License-Identifier: MIT
// Memory that travels to other processes again and again.
#pragma once

#include <cstddef>
#include <deque>
#include <memory>
#include <optional>
#include <span>

#include "platform/base/data.h"
#include "platform/base/mapping.h"
#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"

namespace brivo {

/// Blocks of shared memory (memfds) of one size. A block is filled and sent away as Data; when the last copy
/// of that Data has gone and no other process has the block open or mapped any more, take() gives it out
/// again: fresh shared memory costs several times what its filling costs. Where the kernel cannot tell who
/// has a block open, every block is fresh. *Thread-safe.*
class MemoryPool : public std::enable_shared_from_this<MemoryPool> {
  struct Memory {
    UniqueFd fd;
    Mapping mapping;
  };

 public:
  /// Memory to fill, of the pool's block size; what it holds is left over from its last use. Goes back to the
  /// pool when it is dropped. *Thread-bound.*
  class Block {
   public:
    Block(Block&&) noexcept = default;
    Block& operator=(Block&&) noexcept = default;
    ~Block();

    std::span<std::byte> bytes() const { return memory_->mapping.bytes(); }
    /// The first `used` bytes as data that knows its memfd: open for reading only and sealed against
    /// shrinking, growing and new writable mappings (memfd_create(2)). Empty when the process has no
    /// descriptor left.
    Data send(std::size_t used) &&;

   private:
    friend class MemoryPool;
    Block(std::shared_ptr<MemoryPool> pool, std::unique_ptr<Memory> memory)
        : pool_(std::move(pool)), memory_(std::move(memory)) {}

    std::shared_ptr<MemoryPool> pool_;
    std::unique_ptr<Memory> memory_;
  };

  /// Blocks of `blockSize` bytes; `keep` of those that came back are kept, for the next take(), and freed
  /// with the pool. `name` shows up in /proc only.
  static std::shared_ptr<MemoryPool> create(const char* name, std::size_t blockSize, std::size_t keep);

  /// None when memory or descriptors run out; errno tells why.
  std::optional<Block> take() BRIVO_EXCLUDES(mutex_);
  /// Frees what came back.
  void trim() BRIVO_EXCLUDES(mutex_);

 private:
  struct Sent;

  MemoryPool(const char* name, std::size_t blockSize, std::size_t keep)
      : name_(name), blockSize_(blockSize), keep_(keep) {}

  static std::unique_ptr<Memory> makeMemory(const char* name, std::size_t size);
  static bool isOursAlone(const Memory& memory);
  static bool kernelTellsWhoReads();
  void giveBack(std::unique_ptr<Memory> memory) BRIVO_EXCLUDES(mutex_);

  const char* const name_;
  const std::size_t blockSize_;
  const std::size_t keep_;

  Mutex mutex_;
  std::deque<std::unique_ptr<Memory>> returned_ BRIVO_GUARDED_BY(mutex_);  // others may have them open still
};

}  // namespace brivo
