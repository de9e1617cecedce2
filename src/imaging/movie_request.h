// SPDX-License-Identifier: MIT
#pragma once

#include <optional>

#include "imaging/movie_input.h"
#include "imaging/picture.h"
#include "imaging/sample_entry.h"
#include "platform/images/byte_source.h"
#include "platform/movies/movie_reader.h"

namespace brivo::imaging {

/// How the pictures of a video track are stored.
struct VideoStorage {
  bool decodable = false;         ///< there is a decoder, and they are not encrypted
  VideoFormatDescription format;  ///< the first of the track; its size is 0 where that is not known
};
/// `entries` are those of the stream's movie.
VideoStorage storageOf(const AVStream& stream, const SampleEntries& entries);
/// None where the container has no such thing.
SampleEntries sampleEntriesOf(const MovieInput& input);

// As MovieReader says. Pure but for memory.

std::optional<MovieDescription> describeMovie(const images::ByteSource& source);
/// The picture in the size in which it fits into `maximum`, as scaledForJpeg() gives it.
std::optional<Picture> firstFrameOf(const images::ByteSource& source, MaximumSize maximum);

}  // namespace brivo::imaging
