// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <cstdint>

namespace brivo {

/// How far a device's catalogue has come. *Thread-safe*; the counters are changed independently of each
/// other.
class CatalogueCounters {
 public:
  /// Objects that preflight counted.
  std::int32_t preflightCount() const { return preflightCount_; }
  void incrementPreflightObjectCount(std::int32_t delta) { preflightCount_ += delta; }
  void resetPreflightCount() { preflightCount_ = 0; }

  /// Files in the index.
  std::uint32_t enumeratedItemCount() const { return enumeratedCount_; }
  /// Wraps around, so that all bits set takes one away.
  void updateEnumeratedItemCountWithDelta(std::uint32_t delta) { enumeratedCount_ += delta; }

  /// Downloadable objects announced to clients.
  std::int32_t msObjectCount() const { return msObjectCount_; }
  void setMsObjectCount(std::int32_t count) { msObjectCount_ = count; }
  void incrementMSObjectCount(std::int32_t delta) { msObjectCount_ += delta; }
  void decrementMSObjectCount(std::int32_t delta) { msObjectCount_ -= delta; }

  bool catalogingDone() const { return catalogingDone_; }
  void setCatalogingDone(bool done) { catalogingDone_ = done; }

  /// 100 when the catalogue is done; 0 while nothing is announced; else the files in the index as a share of
  /// the objects announced, which may be above 100.
  std::uint32_t contentCatalogPercentCompleted() const;

 private:
  std::atomic<std::int32_t> preflightCount_ = 0;
  std::atomic<std::uint32_t> enumeratedCount_ = 0;
  std::atomic<std::int32_t> msObjectCount_ = 0;
  std::atomic<bool> catalogingDone_ = false;
};

}  // namespace brivo
