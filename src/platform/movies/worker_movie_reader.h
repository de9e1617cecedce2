// SPDX-License-Identifier: MIT
#pragma once

#include "platform/decoding/worker_pool.h"
#include "platform/movies/movie_reader.h"

namespace brivo {

/// Has confined worker processes read, so that a bad movie costs its own request alone. Files must be open
/// for reading alone. *Thread-safe.*
class WorkerMovieReader final : public MovieReader {
 public:
  /// `workers` must outlive this.
  explicit WorkerMovieReader(WorkerPool& workers) : workers_(workers) {}

  std::optional<MovieDescription> describe(const UniqueFd& file) override;
  std::optional<Data> firstFrame(const UniqueFd& file, MaximumSize maximum) override;

 private:
  WorkerPool& workers_;
};

}  // namespace brivo
