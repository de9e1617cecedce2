// SPDX-License-Identifier: MIT
// Reading of movies. Who reads, and in which process, is not the caller's matter.
#pragma once

#include <cstdint>
#include <optional>

#include "platform/base/data.h"
#include "platform/base/unique_fd.h"
#include "platform/movies/movie_description.h"

namespace brivo {

/// A bound on the size of an image, in pixels; 0 bounds nothing.
struct MaximumSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
};

/// Every function reads `file` from its start, whatever the file's position is, and takes a bounded time.
/// *Thread-safe.*
class MovieReader {
 public:
  virtual ~MovieReader() = default;

  /// None when the file is no movie, or none that can be read. Reads no more than the container's index, of
  /// each of its parts at least 4 KiB, and 2 MiB beside it.
  virtual std::optional<MovieDescription> describe(const UniqueFd& file) = 0;
  /// A JPEG of the first picture of the first video track, within `maximum` and not larger than it is shown.
  /// The track's transform is not applied. None when there is no such picture.
  virtual std::optional<Data> firstFrame(const UniqueFd& file, MaximumSize maximum) = 0;
};

}  // namespace brivo
