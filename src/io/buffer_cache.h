// SPDX-License-Identifier: MIT
#pragma once

#include <array>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>

#include "platform/base/data.h"
#include "platform/base/memory_pool.h"
#include "platform/base/mutex.h"
#include "platform/work/serial_queue.h"

namespace brivo {

/// The file that a cache reads ahead in.
class ReadAheadSource {
 public:
  virtual ~ReadAheadSource() = default;
  virtual const std::string& name() const = 0;
  /// Bytes, as the catalogue entry says.
  virtual std::uint64_t size() const = 0;
  /// Bytes read into `buffer` from `offset` on, not beyond size(); 0 or less when there is nothing to be had.
  virtual std::int64_t readStream(std::span<std::byte> buffer, std::uint64_t offset) const = 0;
};

/// Reads ahead of a client that takes a file piece by piece: fills up to five slots of 2 MiB from the
/// beginning of the file on, goes on whenever a slot is taken, and ends with an empty piece where the file
/// gives no more. What is read travels to the client in the slot's own memory. *Thread-safe*; it reads on its
/// own queue, and what has been read can be taken meanwhile.
///
///     startReading(), then for each piece: consumeBufferAtOffset(), setConsumedOffset()
class OVBufferCache {
 public:
  static constexpr std::size_t kSlotCount = 5;
  static constexpr std::size_t kSlotSize = 2'097'152;

  /// Null, with a line in the log, when there is no memory for a slot. `msFile` must outlive the cache;
  /// `opQueue` must be the cache's own.
  static std::unique_ptr<OVBufferCache> initWithFile(const ReadAheadSource& msFile,
                                                     std::shared_ptr<SerialQueue> opQueue);
  /// Waits for a read that is under way. Must not be called on the cache's queue.
  ~OVBufferCache();
  OVBufferCache(const OVBufferCache&) = delete;
  OVBufferCache& operator=(const OVBufferCache&) = delete;

  /// Begins to read ahead. Does not wait.
  void startReading() BRIVO_EXCLUDES(mutex_);
  /// Ends reading ahead; what was read stays. Does not wait.
  void stopReading() BRIVO_EXCLUDES(mutex_);

  /// The piece that begins at `offset`, in the memory that it was read into, with its size in `sized`; none,
  /// with `sized` unchanged, when no filled slot begins there. Waits, without limit, while this piece is
  /// being read, and while no slot is filled and one may still come. The slot stays taken until the next
  /// call, if setConsumedOffset() names it.
  std::optional<Data> consumeBufferAtOffset(std::uint64_t offset, std::uint64_t& sized)
      BRIVO_EXCLUDES(mutex_);
  /// Which piece was handed out last; the next consumeBufferAtOffset() has its slot filled anew.
  void setConsumedOffset(std::int64_t offset) BRIVO_EXCLUDES(mutex_);
  /// Gives the slot of the piece at `offset` other memory and has it filled. Does not wait.
  void resetBufferAtOffset(std::uint64_t offset) BRIVO_EXCLUDES(mutex_);
  /// Copies the piece that begins at `offset` into `buf`, as much as that takes, sets `sized` to the piece's
  /// size and has its slot filled anew; without such a piece nothing changes. Waits like
  /// consumeBufferAtOffset().
  void dequeueBufferAtOffset(std::uint64_t offset, std::uint64_t& sized, std::span<std::byte> buf)
      BRIVO_EXCLUDES(mutex_);

 private:
  struct Filled {
    std::size_t slot;
    std::size_t bytesRead;
  };
  using FilledSlots = std::map<std::uint64_t, Filled>;  // by the offset at which a slot's bytes begin

  OVBufferCache(const ReadAheadSource& msFile, std::shared_ptr<SerialQueue> opQueue)
      : msFile_(msFile), opQueue_(std::move(opQueue)) {}

  bool mapSlot(std::size_t slot) BRIVO_REQUIRES(mutex_);
  void recycle(std::uint64_t offset) BRIVO_REQUIRES(mutex_);
  void free(FilledSlots::iterator filled) BRIVO_REQUIRES(mutex_);
  void readQueue();
  /// On the queue.
  void readStep() BRIVO_EXCLUDES(mutex_);
  std::optional<std::size_t> takeFreeSlot() BRIVO_REQUIRES(mutex_);
  /// Whether the piece at `offset`, or any, may still come and has to be waited for.
  bool mayCome(std::uint64_t offset) const BRIVO_REQUIRES(mutex_);
  /// The filled slot that begins at `offset`, once it is known whether there is one; else bufDict_.end().
  FilledSlots::iterator whenFilled(std::uint64_t offset) BRIVO_REQUIRES(mutex_);

  const ReadAheadSource& msFile_;
  const std::shared_ptr<SerialQueue> opQueue_;
  /// The slots, what a reply may hold of them, and one more that a client may still be looking at.
  const std::shared_ptr<MemoryPool> memory_ = MemoryPool::create("brivod-slot", kSlotSize, 2);

  Mutex mutex_;
  std::condition_variable_any changed_;
  /// Empty: the memory is with a reply, or with the read under way.
  std::array<std::optional<MemoryPool::Block>, kSlotCount> bufferCache_ BRIVO_GUARDED_BY(mutex_);
  std::deque<std::size_t> availSlots_ BRIVO_GUARDED_BY(mutex_);
  FilledSlots bufDict_ BRIVO_GUARDED_BY(mutex_);
  std::uint64_t readOffset_ BRIVO_GUARDED_BY(mutex_) = 0;
  std::int64_t consumedOffset_ BRIVO_GUARDED_BY(mutex_) = -1;
  bool started_ BRIVO_GUARDED_BY(mutex_) = false;
  bool reading_ BRIVO_GUARDED_BY(mutex_) = false;
  bool readUnderWay_ BRIVO_GUARDED_BY(mutex_) = false;
};

}  // namespace brivo
