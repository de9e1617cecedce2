// SPDX-License-Identifier: MIT
#include "io/buffer_cache.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <semaphore>
#include <utility>

#include "util/log.h"

namespace brivo {

std::unique_ptr<OVBufferCache> OVBufferCache::initWithFile(const ReadAheadSource& msFile,
                                                           std::shared_ptr<SerialQueue> opQueue) {
  std::unique_ptr<OVBufferCache> cache(new OVBufferCache(msFile, std::move(opQueue)));
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
  opQueue_->runAndWait([] {});  // behind a step that was queued before reading stopped
}

bool OVBufferCache::mapSlot(std::size_t slot) {
  bufferCache_[slot] = memory_->take();
  return bufferCache_[slot].has_value();
}

void OVBufferCache::startReading() {
  opQueue_->post([this] {
    started_ = true;
    reading_ = true;
    readQueue();
  });
}

void OVBufferCache::stopReading() {
  opQueue_->post([this] {
    reading_ = false;
    serveTakes();
  });
}

// -------------------------------------------------------------------------------------------------- filling

void OVBufferCache::readQueue() {
  opQueue_->post([this] { readStep(); });
}

void OVBufferCache::readStep() {
  if (!reading_ || availSlots_.empty() || bufDict_.contains(readOffset_)) return;
  const std::size_t slot = availSlots_.front();
  availSlots_.pop_front();
  OVLogVerbose(kLogTypeDetail, "--slot", "Slots Available: {}", availSlots_.size());
  const std::int64_t count = msFile_.readStream(bufferCache_[slot]->bytes(), readOffset_);
  const std::size_t bytesRead = count > 0 ? static_cast<std::size_t>(count) : 0;  // a failed read ends it too
  if (bytesRead == 0) reading_ = false;
  bufDict_.emplace(readOffset_, Filled{slot, bytesRead});
  readOffset_ += bytesRead;
  serveTakes();
  if (reading_ && bufDict_.size() < kSlotCount) readQueue();
}

void OVBufferCache::free(std::map<std::uint64_t, Filled>::iterator filled) {
  availSlots_.push_back(filled->second.slot);
  bufDict_.erase(filled);
  readQueue();
}

void OVBufferCache::resetBufferAtOffset(std::uint64_t offset) {
  opQueue_->post([this, offset] {
    const auto filled = bufDict_.find(offset);
    if (filled == bufDict_.end()) return;
    const std::size_t slot = filled->second.slot;
    if (mapSlot(slot)) return free(filled);
    OVLogError(msFile_.name(), "mmap failed for slot: {}", slot);
  });
}

// --------------------------------------------------------------------------------------------------- taking

void OVBufferCache::whenFilled(const Take& take) {
  std::binary_semaphore done(0);
  opQueue_->post([&] {
    takes_.emplace_back([&] {
      take();
      done.release();
    });
    serveTakes();
  });
  done.acquire();
}

void OVBufferCache::serveTakes() {
  if (bufDict_.empty() && moreMayCome()) return;
  for (const Take& take : std::exchange(takes_, {})) take();
}

std::optional<Data> OVBufferCache::consumeBufferAtOffset(std::uint64_t offset, std::uint64_t& sized) {
  if (consumedOffset_ != -1) resetBufferAtOffset(static_cast<std::uint64_t>(consumedOffset_));
  std::optional<Data> piece;
  whenFilled([&] {
    const auto filled = bufDict_.find(offset);
    if (filled == bufDict_.end() || !bufferCache_[filled->second.slot]) return;
    piece = std::move(*bufferCache_[filled->second.slot]).send(filled->second.bytesRead);
    bufferCache_[filled->second.slot].reset();
    sized = piece->size();
  });
  return piece;
}

void OVBufferCache::dequeueBufferAtOffset(std::uint64_t offset, std::uint64_t& sized,
                                          std::span<std::byte> buf) {
  whenFilled([&] {
    const auto filled = bufDict_.find(offset);
    if (filled == bufDict_.end() || !bufferCache_[filled->second.slot]) return;
    const auto [slot, bytesRead] = filled->second;
    OVLogVerbose(kLogTypeDetail, "++deq", "Dequeing Slot: {}", slot);
    sized = bytesRead;
    std::ranges::copy(bufferCache_[slot]->bytes().first(std::min(bytesRead, buf.size())), buf.begin());
    free(filled);
    OVLogVerbose(kLogTypeDetail, "++slot", "Slots Available: {}", availSlots_.size());
  });
}

}  // namespace brivo
