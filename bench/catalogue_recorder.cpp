// SPDX-License-Identifier: MIT
#include "catalogue_recorder.h"

#include <algorithm>
#include <stdexcept>

namespace brivo::bench {

namespace {

constexpr std::chrono::minutes kLongestCatalogue{2};

void keepFirst(double& time, double now) {
  if (time == 0) time = now;
}

}  // namespace

void CatalogueRecorder::begin() {
  const std::lock_guard lock(mutex_);
  watch_ = Stopwatch();
}

void CatalogueRecorder::ready() {
  const std::lock_guard lock(mutex_);
  keepFirst(times_.ready, watch_.milliseconds());
}

void CatalogueRecorder::fileArrived() {
  const std::lock_guard lock(mutex_);
  keepFirst(times_.firstFile, watch_.milliseconds());
}

void CatalogueRecorder::arrived(std::size_t objects) {
  const std::lock_guard lock(mutex_);
  const double now = watch_.milliseconds();
  keepFirst(times_.firstBatch, now);
  times_.last = now;
  missing_ -= std::min(objects, missing_);
  if (missing_ == 0) complete_.notify_all();
}

void CatalogueRecorder::sizesArrived(std::size_t files) {
  const std::lock_guard lock(mutex_);
  filesWithSize_ += files;
}

std::size_t CatalogueRecorder::filesWithSize() const {
  const std::lock_guard lock(mutex_);
  return filesWithSize_;
}

CatalogueTimes CatalogueRecorder::wait() {
  std::unique_lock lock(mutex_);
  if (!complete_.wait_for(lock, kLongestCatalogue, [this] { return missing_ == 0; })) {
    throw std::runtime_error("the catalogue did not arrive");
  }
  return times_;
}

}  // namespace brivo::bench
