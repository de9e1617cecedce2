// SPDX-License-Identifier: MIT
// Movies: what their container says, and their first frame. Both wait for the movie service, without limit.
#include <algorithm>
#include <array>
#include <limits>
#include <semaphore>

#include "content/media/brivo_file.h"
#include "content/media/video_orientation.h"
#include "platform/movies/movie_service.h"
#include "platform/text/unicode.h"
#include "util/log.h"

namespace brivo {

namespace {

using Status = MovieAsset::ValueStatus;

constexpr const char* kAssetClass = "MovieAsset";

/// Where a movie's metadata items go.
struct Place {
  std::string_view commonKey;
  const char* dictionary;
  const char* key;
};
constexpr const char* kTiff = "{TIFF}";
constexpr const char* kMakerNote = "{MakerNorel}";
constexpr std::array kPlaces{Place{"model", kTiff, "Model"}, Place{"software", kTiff, "Software"},
                             Place{"make", kTiff, "Make"}, Place{"identifier", kMakerNote, "17"}};

/// `value` as UTF-8, without what is too long: the texts of every movie of a card stay in memory.
std::string keptText(std::string_view value) {
  constexpr std::size_t kMostBytes = 256;
  const auto isInsideCharacter = [](char byte) { return (static_cast<unsigned char>(byte) & 0xC0) == 0x80; };
  const std::string text = replacingInvalidUtf8(value);
  std::size_t length = std::min(text.size(), kMostBytes);
  while (length < text.size() && isInsideCharacter(text[length])) --length;
  return text.substr(0, length);
}

Dictionary itemsFor(std::string_view dictionary, MovieAsset& asset) {
  Dictionary items;
  for (const auto& [commonKey, value] : asset.commonMetadata()) {
    for (const Place& place : kPlaces) {
      if (place.dictionary == dictionary && place.commonKey == commonKey)
        items.set(place.key, keptText(value));
    }
  }
  return items;
}

/// `number` without its fraction, as far as 32 bits hold it.
std::uint32_t truncated(double number) {
  constexpr double most = std::numeric_limits<std::uint32_t>::max();
  return static_cast<std::uint32_t>(std::clamp(number, 0.0, most));
}

/// The height is far from proportional, so that it is the width that counts. No width asks for the whole
/// picture.
MaximumSize maximumSize(std::uint32_t width, std::uint32_t imageWidth, std::uint32_t imageHeight) {
  if (width == 0) return {};
  return {width, truncated(static_cast<double>(imageWidth) / width * imageHeight)};
}

}  // namespace

std::shared_ptr<MovieAsset> BrivoFile::openMovie() const {
  auto file = device().files().open(path());
  return file.ok() ? device().movies().open(*std::move(file)) : nullptr;
}

void BrivoFile::readMovieProperties() {
  Dictionary properties = metadataDict().value_or(Dictionary());
  setSizeAndOrientationFromImageProperties(properties);
  metadata_ = std::move(properties);
  setHasThumbnail(true);
}

void BrivoFile::buildMovieMetadata() {
  const auto asset = openMovie();
  const std::uint32_t orientation = asset ? videoOrientation(asset->videoTracks()) : 0;
  setImageOrientation(orientation);
  Dictionary result{{"Orientation", orientation}};
  if (asset) {
    std::binary_semaphore loaded(0);
    asset->loadValuesAsynchronously([&] {
      fillMovieMetadata(*asset, result);
      loaded.release();
    });
    loaded.acquire();
  }
  metadata_ = std::move(result);
}

void BrivoFile::fillMovieMetadata(MovieAsset& asset, Dictionary& result) const {
  if (asset.statusOfDuration() == Status::loaded) {
    result.set("VideoDuration", static_cast<double>(static_cast<float>(asset.duration())));
  } else {
    OVLogVerboseOrDebug(kLogTypeContent, name(), "asynchronous load failed to return the duration: {}",
                        name());
  }
  result.set(kTiff, itemsFor(kTiff, asset));
  result.set(kMakerNote, itemsFor(kMakerNote, asset));
  fillMovieSize(asset, result);
}

void BrivoFile::fillMovieSize(MovieAsset& asset, Dictionary& result) const {
  const auto log = [&](const char* what) {
    OVLogVerboseOrDebug(kLogTypeContent, name(), "{} {}: {}", kAssetClass, what, name());
  };
  if (asset.statusOfTracks() != Status::loaded) return log("could not be loaded");
  const auto& tracks = asset.videoTracks();
  if (tracks.empty()) return log("contains no tracks");
  if (!std::ranges::all_of(tracks, &VideoTrack::decodable)) return log("is not decodable");
  const auto& formats = tracks.front().formatDescriptions;
  if (formats.empty()) return log("missing format descriptions");
  const VideoDimensions shown = presentationDimensions(formats.front());
  result.set("PixelHeight", truncated(shown.height));
  result.set("PixelWidth", truncated(shown.width));
}

std::optional<Data> BrivoFile::movieThumbnailDataForPixelWidth(std::uint32_t width) const {
  const auto asset = openMovie();
  if (!asset) return std::nullopt;
  OVLogVerboseOrDebug(kLogTypeContent, name(), "[ExFATCamera thumbData] file://{}", path());
  std::optional<Data> image;
  std::binary_semaphore made(0);
  const auto keep = [&](std::optional<Data> frame) {
    if (!frame) {
      OVLogError(name(), "The image generator failed to generate a preview thumbnail: {}", name());
    }
    image = std::move(frame);
    made.release();
  };
  asset->generateFirstFrameAsynchronously(maximumSize(width, imageWidth(), imageHeight()), keep);
  made.acquire();
  return image;
}

}  // namespace brivo
