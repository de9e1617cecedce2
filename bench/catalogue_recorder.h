// SPDX-License-Identifier: MIT
#pragma once

#include <condition_variable>
#include <cstddef>
#include <mutex>

#include "figures.h"

namespace brivo::bench {

/// When the parts of one catalogue arrived, in milliseconds since it was asked for; 0 for what never came.
struct CatalogueTimes {
  double ready = 0;
  double firstBatch = 0;  ///< usually the card's own folder, DCIM
  double firstFile = 0;
  double last = 0;
};

/// Keeps the times of one catalogue. *Thread-safe.*
class CatalogueRecorder {
 public:
  /// `objects` complete the catalogue.
  explicit CatalogueRecorder(std::size_t objects) : missing_(objects) {}

  /// The time counts from here on.
  void begin();

  void ready();
  void fileArrived();
  /// So many files came with the size of the picture in them.
  void sizesArrived(std::size_t files);
  void arrived(std::size_t objects);
  /// Waits for the last object. Throws when it has not come within two minutes.
  CatalogueTimes wait();
  std::size_t filesWithSize() const;

 private:
  mutable std::mutex mutex_;
  Stopwatch watch_;
  std::condition_variable complete_;
  std::size_t missing_;
  std::size_t filesWithSize_ = 0;
  CatalogueTimes times_;
};

}  // namespace brivo::bench
