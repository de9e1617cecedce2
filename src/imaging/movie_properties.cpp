// SPDX-License-Identifier: MIT
// What a movie's container says of the movie and its tracks.
extern "C" {
#include <libavcodec/avcodec.h>
}

#include <algorithm>
#include <array>
#include <cctype>
#include <cstring>
#include <span>
#include <string_view>

#include "imaging/movie_request.h"

namespace brivo::imaging {

namespace {

std::span<AVStream* const> streamsOf(const AVFormatContext& container) {
  return {container.streams, container.nb_streams};
}

bool isComplete(const AVStream& stream) {
  const AVCodecParameters& codec = *stream.codecpar;
  return !isVideo(stream) || (codec.codec_id != AV_CODEC_ID_NONE && codec.width > 0 && codec.height > 0);
}

/// Most containers say everything in their index, and a look at packets would cost many times as much.
bool saysEverything(const AVFormatContext& container) {
  return (container.ctx_flags & AVFMTCTX_NOHEADER) == 0 && container.duration != AV_NOPTS_VALUE &&
         container.duration > 0 && std::ranges::all_of(streamsOf(container), [](const AVStream* stream) {
           return isComplete(*stream);
         });
}

std::optional<double> durationOf(const AVFormatContext& container) {
  if (container.duration == AV_NOPTS_VALUE || container.duration < 0) return std::nullopt;
  return static_cast<double>(container.duration) / AV_TIME_BASE;
}

/// The matrix of a track header: a, b, u, c, d, v, x, y, w, as 16.16 but for u, v and w, which are 2.30.
AffineTransform transformOf(const AVStream& stream) {
  std::array<std::int32_t, 9> matrix{};
  std::size_t length = 0;
  const std::uint8_t* stated = av_stream_get_side_data(&stream, AV_PKT_DATA_DISPLAYMATRIX, &length);
  if (!stated || length < sizeof matrix) return AffineTransform::identity();
  std::memcpy(matrix.data(), stated, sizeof matrix);
  constexpr double kOneOf2Point30 = 1 << 30;
  constexpr double kOneOf16Point16 = 1 << 16;
  const double w = matrix[8] == 0 ? 1 : matrix[8] / kOneOf2Point30;
  const auto element = [&](std::size_t index) { return matrix[index] / kOneOf16Point16 / w; };
  return {element(0), element(1), element(3), element(4), element(6), element(7)};
}

VideoTrack trackOf(const AVStream& stream, const SampleEntries& entries) {
  const VideoStorage storage = storageOf(stream, entries);
  VideoTrack track{transformOf(stream), storage.decodable, {}};
  if (storage.format.width != 0 && storage.format.height != 0)
    track.formatDescriptions.push_back(storage.format);
  return track;
}

struct CommonKey {
  std::string_view ending;  ///< of the container's key
  const char* name;
};
constexpr std::array kCommonKeys{CommonKey{"make", "make"}, CommonKey{"model", "model"},
                                 CommonKey{"software", "software"},
                                 CommonKey{"content.identifier", "identifier"}};

bool endsWith(std::string_view key, std::string_view ending) {
  const auto same = [](unsigned char a, unsigned char b) { return std::tolower(a) == b; };
  return key.size() >= ending.size() &&
         std::ranges::equal(key.substr(key.size() - ending.size()), ending, same);
}

std::vector<MovieMetadataItem> metadataOf(const AVFormatContext& container) {
  std::vector<MovieMetadataItem> items;
  const AVDictionaryEntry* entry = nullptr;
  while ((entry = av_dict_get(container.metadata, "", entry, AV_DICT_IGNORE_SUFFIX)) != nullptr) {
    for (const auto& [ending, name] : kCommonKeys) {
      if (endsWith(entry->key, ending)) items.push_back({name, entry->value});
    }
  }
  return items;
}

VideoFormatDescription formatOf(const AVStream& stream) {
  const AVCodecParameters& codec = *stream.codecpar;
  VideoFormatDescription format;
  format.width = static_cast<std::uint32_t>(std::max(codec.width, 0));
  format.height = static_cast<std::uint32_t>(std::max(codec.height, 0));
  const AVRational shape =
      stream.sample_aspect_ratio.num != 0 ? stream.sample_aspect_ratio : codec.sample_aspect_ratio;
  if (shape.num > 0 && shape.den > 0) {
    format.horizontalSpacing = static_cast<std::uint32_t>(shape.num);
    format.verticalSpacing = static_cast<std::uint32_t>(shape.den);
  }
  return format;
}

}  // namespace

SampleEntries sampleEntriesOf(const MovieInput& input) {
  const bool isIsoMedia = std::string_view(input.container().iformat->name).starts_with("mov,");
  return isIsoMedia ? firstSampleEntries(input.source()) : SampleEntries();
}

VideoStorage storageOf(const AVStream& stream, const SampleEntries& entries) {
  const auto found = entries.find(static_cast<std::uint32_t>(stream.id));
  const SampleEntry* entry = found == entries.end() ? nullptr : &found->second;
  // The tag of a key is all that is left of the encryption in Matroska.
  const bool isEncrypted =
      (entry && entry->encrypted) || av_dict_get(stream.metadata, "enc_key_id", nullptr, 0);
  VideoStorage storage;
  storage.decodable = !isEncrypted && avcodec_find_decoder(stream.codecpar->codec_id) != nullptr;
  const bool isSizeStated = entry && entry->format.width != 0 && entry->format.height != 0;
  storage.format = isSizeStated ? entry->format : formatOf(stream);
  return storage;
}

std::optional<MovieDescription> describeMovie(const images::ByteSource& source) {
  const auto input = MovieInput::open(source);
  if (!input) return std::nullopt;
  const AVFormatContext& container = input->container();
  if (!saysEverything(container)) input->completeStreams();
  MovieDescription movie;
  movie.duration = durationOf(container);
  const SampleEntries entries = sampleEntriesOf(*input);
  for (const AVStream* stream : streamsOf(container)) {
    if (isVideo(*stream)) movie.videoTracks.push_back(trackOf(*stream, entries));
  }
  movie.metadata = metadataOf(container);
  return movie;
}

}  // namespace brivo::imaging
