// SPDX-License-Identifier: MIT
#include "platform/movies/movie_description.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>

#include "platform/base/byte_cursor.h"

namespace brivo {

namespace {

constexpr std::size_t kMostTracks = 256;
constexpr std::size_t kMostFormats = 64;
constexpr std::size_t kMostItems = 256;
constexpr std::size_t kLongestText = 4096;

class Writer {
 public:
  void number(std::uint32_t value) { append(value); }
  void number(double value) { append(std::bit_cast<std::uint64_t>(value)); }
  void text(const std::string& value) {
    const std::string_view kept = std::string_view(value).substr(0, kLongestText);
    number(static_cast<std::uint32_t>(kept.size()));
    const auto content = std::as_bytes(std::span(kept));
    bytes_.insert(bytes_.end(), content.begin(), content.end());
  }
  /// How many of `list` follow.
  template <class Element>
  std::span<const Element> counted(const std::vector<Element>& list, std::size_t most) {
    const auto kept = std::span(list).first(std::min(list.size(), most));
    number(static_cast<std::uint32_t>(kept.size()));
    return kept;
  }
  std::vector<std::byte> take() { return std::move(bytes_); }

 private:
  template <class Number>
  void append(Number value) {
    const auto content = std::as_bytes(std::span(&value, 1));
    bytes_.insert(bytes_.end(), content.begin(), content.end());
  }

  std::vector<std::byte> bytes_;
};

void write(Writer& to, const VideoFormatDescription& format) {
  for (const auto side : {format.width, format.height}) to.number(side);
  for (const auto side : {format.horizontalSpacing, format.verticalSpacing}) to.number(side);
  to.number(format.cleanAperture ? std::uint32_t{1} : 0);
  if (!format.cleanAperture) return;
  const CleanAperture& clean = *format.cleanAperture;
  for (const double value : {clean.width, clean.height, clean.horizontalOffset, clean.verticalOffset})
    to.number(value);
}

void write(Writer& to, const VideoTrack& track) {
  const AffineTransform& map = track.preferredTransform;
  for (const double value : {map.a, map.b, map.c, map.d, map.tx, map.ty}) to.number(value);
  to.number(track.decodable ? std::uint32_t{1} : 0);
  for (const auto& format : to.counted(track.formatDescriptions, kMostFormats)) write(to, format);
}

/// Once something is wrong, everything it gives is empty. Numbers are finite.
class Reader {
 public:
  explicit Reader(std::span<const std::byte> bytes) : cursor_(bytes, std::endian::native) {}

  bool isWholeAndRead() const { return sound_ && cursor_.ok() && cursor_.remaining() == 0; }
  std::uint32_t number() { return cursor_.u32(); }
  std::uint32_t positive() {
    const std::uint32_t value = number();
    sound_ = sound_ && value != 0;
    return value;
  }
  bool flag() {
    const std::uint32_t value = number();
    sound_ = sound_ && value <= 1;
    return value == 1;
  }
  double real() {
    const auto value = std::bit_cast<double>(cursor_.u64());
    sound_ = sound_ && std::isfinite(value);
    return value;
  }
  std::size_t count(std::size_t most) {
    const std::size_t value = number();
    sound_ = sound_ && cursor_.ok() && value <= most;
    return sound_ ? value : 0;
  }
  std::string text() {
    const auto content = cursor_.take(count(kLongestText));
    std::string value(content.size(), '\0');
    std::ranges::copy(content, std::as_writable_bytes(std::span(value)).begin());
    return value;
  }

 private:
  ByteCursor cursor_;
  bool sound_ = true;
};

// Elements of a braced list are evaluated from left to right, in which order they were written.

VideoFormatDescription readFormat(Reader& from) {
  VideoFormatDescription format{from.number(), from.number(), from.positive(), from.positive()};
  if (from.flag()) format.cleanAperture = CleanAperture{from.real(), from.real(), from.real(), from.real()};
  return format;
}

VideoTrack readTrack(Reader& from) {
  VideoTrack track;
  track.preferredTransform = {from.real(), from.real(), from.real(), from.real(), from.real(), from.real()};
  track.decodable = from.flag();
  for (std::size_t left = from.count(kMostFormats); left != 0; --left)
    track.formatDescriptions.push_back(readFormat(from));
  return track;
}

}  // namespace

VideoDimensions presentationDimensions(const VideoFormatDescription& format) {
  VideoDimensions shown{static_cast<double>(format.width), static_cast<double>(format.height)};
  if (format.cleanAperture) shown = {format.cleanAperture->width, format.cleanAperture->height};
  shown.width = shown.width * format.horizontalSpacing / format.verticalSpacing;
  return shown;
}

std::vector<std::byte> encodeMovieDescription(const MovieDescription& movie) {
  Writer to;
  to.number(movie.duration ? std::uint32_t{1} : 0);
  if (movie.duration) to.number(*movie.duration);
  for (const auto& track : to.counted(movie.videoTracks, kMostTracks)) write(to, track);
  for (const auto& item : to.counted(movie.metadata, kMostItems)) {
    to.text(item.commonKey);
    to.text(item.value);
  }
  return to.take();
}

std::optional<MovieDescription> decodeMovieDescription(std::span<const std::byte> bytes) {
  Reader from(bytes);
  MovieDescription movie;
  if (from.flag()) movie.duration = from.real();
  for (std::size_t left = from.count(kMostTracks); left != 0; --left)
    movie.videoTracks.push_back(readTrack(from));
  for (std::size_t left = from.count(kMostItems); left != 0; --left)
    movie.metadata.push_back({from.text(), from.text()});
  return from.isWholeAndRead() ? std::optional(std::move(movie)) : std::nullopt;
}

}  // namespace brivo
