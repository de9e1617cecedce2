// SPDX-License-Identifier: MIT
#include "imaging/local_movie_reader.h"

#include "imaging/descriptor_source.h"
#include "imaging/jpeg_encoder.h"
#include "imaging/movie_request.h"

namespace brivo {

std::optional<MovieDescription> LocalMovieReader::describe(const UniqueFd& file) {
  return imaging::describeMovie(imaging::DescriptorSource(file));
}

std::optional<Data> LocalMovieReader::firstFrame(const UniqueFd& file, MaximumSize maximum) {
  const auto picture = imaging::firstFrameOf(imaging::DescriptorSource(file), maximum);
  if (!picture) return std::nullopt;
  std::vector<std::byte> jpeg = imaging::encodeJpeg(*picture);
  return jpeg.empty() ? std::nullopt : std::optional(Data(std::move(jpeg)));
}

}  // namespace brivo
