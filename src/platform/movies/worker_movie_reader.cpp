// SPDX-License-Identifier: MIT
#include "platform/movies/worker_movie_reader.h"

namespace brivo {

std::optional<MovieDescription> WorkerMovieReader::describe(const UniqueFd& file) {
  WorkerRequest wanted;
  wanted.operation = WorkerOperation::movieDescription;
  const auto description = resultOf(workers_.ask(wanted, file));
  return description ? decodeMovieDescription(description->bytes()) : std::nullopt;
}

std::optional<Data> WorkerMovieReader::firstFrame(const UniqueFd& file, MaximumSize maximum) {
  WorkerRequest wanted;
  wanted.operation = WorkerOperation::movieFrame;
  wanted.maximumWidth = maximum.width;
  wanted.maximumHeight = maximum.height;
  return resultOf(workers_.ask(wanted, file));
}

}  // namespace brivo
