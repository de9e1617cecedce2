// SPDX-License-Identifier: MIT
#include "io/buffer_cache.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "util/log.h"

namespace brivo {

std::unique_ptr<OVBufferCache> OVBufferCache::initWithFile(const ReadAheadSource& msFile,
                                                           std::shared_ptr<SerialQueue> opQueue) {
  std::unique_ptr<OVBufferCache> cache(new OVBufferCache(msFile, std::move(opQueue)));
  const MutexLock lock(cache->mutex_);
  for (std::size_t slot = 0; slot < kSlotCount; ++slot) {
    if (!cache->mapSlot(slot)) {
      OVLogError(msFile.name(), "mmap failed for slot: {} cause: {}", slot, std::strerror(errno));
      return nullptr;
    }
    cache->availSlots_.push_back(slot);
  }
  return cache;
}

OVBufferCache::~OVBufferCache() {
  stopReading();
  opQueue_->runAndWait([] {});
}

bool OVBufferCache::mapSlot(std::size_t slot) {
  bufferCache_[slot] = memory_->take();
  return bufferCache_[slot].has_value();
}

void OVBufferCache::startReading() {
  const MutexLock lock(mutex_);
  started_ = true;
  reading_ = true;
  readQueue();
}

void OVBufferCache::stopReading() {
  const MutexLock lock(mutex_);
  reading_ = false;
  changed_.notify_all();
}

// -------------------------------------------------------------------------------------------------- filling

void OVBufferCache::readQueue() {
  opQueue_->post([this] { readStep(); });
}

std::optional<std::size_t> OVBufferCache::takeFreeSlot() {
  if (!reading_ || availSlots_.empty() || bufDict_.contains(readOffset_)) return std::nullopt;
  const std::size_t slot = availSlots_.front();
  availSlots_.pop_front();
  OVLogVerbose(kLogTypeDetail, "--slot", "Slots Available: {}", availSlots_.size());
  return slot;
}

void OVBufferCache::readStep() {
  std::optional<MemoryPool::Block> block;
  std::optional<std::size_t> slot;
  std::uint64_t offset = 0;
  {
    const MutexLock lock(mutex_);
    slot = takeFreeSlot();
    if (!slot) return;
    block = std::exchange(bufferCache_[*slot], std::nullopt);
    offset = readOffset_;
    readUnderWay_ = true;
  }
  const std::int64_t count = msFile_.readStream(block->bytes(), offset);
  const std::size_t bytesRead = count > 0 ? static_cast<std::size_t>(count) : 0;  // a failed read ends it too
  const MutexLock lock(mutex_);
  readUnderWay_ = false;
  if (bytesRead == 0) reading_ = false;
  bufferCache_[*slot] = std::move(block);
  bufDict_.emplace(offset, Filled{*slot, bytesRead});
  readOffset_ += bytesRead;
  changed_.notify_all();
  if (reading_ && bufDict_.size() < kSlotCount) readQueue();
}

void OVBufferCache::free(FilledSlots::iterator filled) {
  availSlots_.push_back(filled->second.slot);
  bufDict_.erase(filled);
  readQueue();
}

void OVBufferCache::recycle(std::uint64_t offset) {
  const auto filled = bufDict_.find(offset);
  if (filled == bufDict_.end()) return;
  const std::size_t slot = filled->second.slot;
  if (mapSlot(slot)) return free(filled);
  OVLogError(msFile_.name(), "mmap failed for slot: {}", slot);
}

void OVBufferCache::resetBufferAtOffset(std::uint64_t offset) {
  const MutexLock lock(mutex_);
  recycle(offset);
}

// --------------------------------------------------------------------------------------------------- taking

void OVBufferCache::setConsumedOffset(std::int64_t offset) {
  const MutexLock lock(mutex_);
  consumedOffset_ = offset;
}

bool OVBufferCache::mayCome(std::uint64_t offset) const {
  const bool isNext = offset == readOffset_ && (readUnderWay_ || (reading_ && !availSlots_.empty()));
  return !bufDict_.contains(offset) && (isNext || (bufDict_.empty() && (!started_ || reading_)));
}

OVBufferCache::FilledSlots::iterator OVBufferCache::whenFilled(std::uint64_t offset) {
  while (mayCome(offset)) changed_.wait(mutex_);
  const auto filled = bufDict_.find(offset);
  const bool isHere = filled != bufDict_.end() && bufferCache_[filled->second.slot];
  return isHere ? filled : bufDict_.end();
}

std::optional<Data> OVBufferCache::consumeBufferAtOffset(std::uint64_t offset, std::uint64_t& sized) {
  const MutexLock lock(mutex_);
  if (consumedOffset_ != -1) recycle(static_cast<std::uint64_t>(consumedOffset_));
  const auto filled = whenFilled(offset);
  if (filled == bufDict_.end()) return std::nullopt;
  const auto [slot, bytesRead] = filled->second;
  Data piece = (*std::exchange(bufferCache_[slot], std::nullopt)).send(bytesRead);
  sized = piece.size();
  return piece;
}

void OVBufferCache::dequeueBufferAtOffset(std::uint64_t offset, std::uint64_t& sized,
                                          std::span<std::byte> buf) {
  const MutexLock lock(mutex_);
  const auto filled = whenFilled(offset);
  if (filled == bufDict_.end()) return;
  const auto [slot, bytesRead] = filled->second;
  OVLogVerbose(kLogTypeDetail, "++deq", "Dequeing Slot: {}", slot);
  sized = bytesRead;
  std::ranges::copy(bufferCache_[slot]->bytes().first(std::min(bytesRead, buf.size())), buf.begin());
  free(filled);
  OVLogVerbose(kLogTypeDetail, "++slot", "Slots Available: {}", availSlots_.size());
}

}  // namespace brivo
