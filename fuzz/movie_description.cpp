// SPDX-License-Identifier: MIT
#include "platform/movies/movie_description.h"

#include <algorithm>

#include "check.h"

// What is read is written as it was.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto bytes = std::as_bytes(std::span(data, size));
  const auto movie = brivo::decodeMovieDescription(bytes);
  if (movie) check(std::ranges::equal(brivo::encodeMovieDescription(*movie), bytes));
  return 0;
}
