// SPDX-License-Identifier: MIT
#pragma once

#include "platform/movies/movie_reader.h"

namespace brivo {

/// Reads in this process, as LocalImageDecoder decodes: for the worker, for tests and for fuzzing.
/// *Thread-safe.*
class LocalMovieReader final : public MovieReader {
 public:
  std::optional<MovieDescription> describe(const UniqueFd& file) override;
  std::optional<Data> firstFrame(const UniqueFd& file, MaximumSize maximum) override;
};

}  // namespace brivo
