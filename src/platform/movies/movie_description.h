// SPDX-License-Identifier: MIT
// What a movie's container says, before any of its frames is decoded.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

namespace brivo {

/// Maps stored pixels to shown ones: x' = a x + c y + tx, y' = b x + d y + ty (the matrix of a track header,
/// ISO/IEC 14496-12 section 8.3.2).
struct AffineTransform {
  double a = 0;
  double b = 0;
  double c = 0;
  double d = 0;
  double tx = 0;
  double ty = 0;

  static constexpr AffineTransform identity() { return {1, 0, 0, 1, 0, 0}; }
  bool operator==(const AffineTransform&) const = default;
};

/// The part of each picture that is meant to be seen, in stored pixels around the picture's centre (ISO/IEC
/// 14496-12 section 12.1.4).
struct CleanAperture {
  double width = 0;
  double height = 0;
  double horizontalOffset = 0;
  double verticalOffset = 0;

  bool operator==(const CleanAperture&) const = default;
};

struct VideoDimensions {
  double width = 0;
  double height = 0;

  bool operator==(const VideoDimensions&) const = default;
};

/// One way in which the pictures of a track are stored.
struct VideoFormatDescription {
  std::uint32_t width = 0;  ///< stored pixels, as is the next
  std::uint32_t height = 0;
  // Width to height of one pixel, neither of them 0.
  std::uint32_t horizontalSpacing = 1;
  std::uint32_t verticalSpacing = 1;
  std::optional<CleanAperture> cleanAperture = std::nullopt;

  bool operator==(const VideoFormatDescription&) const = default;
};

/// The size in which pictures are shown, with their clean aperture and the shape of their pixels applied and
/// without the track's transform. Pixels need not be square for it to be given in units of their height.
VideoDimensions presentationDimensions(const VideoFormatDescription& format);

struct VideoTrack {
  AffineTransform preferredTransform;
  /// There is a decoder, and nothing is encrypted.
  bool decodable = false;
  std::vector<VideoFormatDescription> formatDescriptions;

  bool operator==(const VideoTrack&) const = default;
};

/// What a movie says of itself under a key that containers share.
struct MovieMetadataItem {
  std::string commonKey;  ///< "make", "model", "software" or "identifier"
  std::string value;      ///< UTF-8

  bool operator==(const MovieMetadataItem&) const = default;
};

/// *Immutable* where it is shared.
struct MovieDescription {
  std::optional<double> duration;           ///< seconds; none when the container tells none
  std::vector<VideoTrack> videoTracks;      ///< in the order of the container
  std::vector<MovieMetadataItem> metadata;  ///< likewise

  bool operator==(const MovieDescription&) const = default;
};

// The form in which processes of one build hand descriptions to each other.

/// What is beyond the limits that decodeMovieDescription() has is left out.
std::vector<std::byte> encodeMovieDescription(const MovieDescription& movie);
/// None when the bytes are not what the function above makes. Pure, and bounded whatever the bytes are.
std::optional<MovieDescription> decodeMovieDescription(std::span<const std::byte> bytes);

}  // namespace brivo
