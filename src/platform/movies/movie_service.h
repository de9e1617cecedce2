// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "platform/movies/movie_asset.h"
#include "platform/work/lane.h"
#include "platform/work/pool.h"

namespace brivo {

/// Opens movies, and has threads on which they are read. Values and frames have separate threads, so that a
/// frame does not wait for the values of a whole card. *Thread-safe.*
class MovieService {
 public:
  /// At most `values` movies have their values loaded at once, and `frames` a frame made. `reader` must
  /// outlive this.
  MovieService(MovieReader& reader, std::size_t values, std::size_t frames)
      : reader_(reader),
        threads_(values + frames),
        valueLane_(Lane::create(threads_, values)),
        frameLane_(Lane::create(threads_, frames)) {}

  /// Takes over `file`, open for reading alone. Null when it is not open. This must outlive the asset.
  std::shared_ptr<MovieAsset> open(UniqueFd file) {
    if (!file) return nullptr;
    return std::make_shared<MovieAsset>(MovieAsset::MakingKey{}, *this, std::move(file));
  }

 private:
  friend class MovieAsset;

  MovieReader& reader_;
  Pool threads_;
  const std::shared_ptr<Lane> valueLane_;
  const std::shared_ptr<Lane> frameLane_;
};

}  // namespace brivo
