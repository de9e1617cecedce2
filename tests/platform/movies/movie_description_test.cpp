// SPDX-License-Identifier: MIT
#include "platform/movies/movie_description.h"

#include <gtest/gtest.h>

#include <limits>

namespace brivo {
namespace {

MovieDescription example() {
  MovieDescription movie;
  movie.duration = 12.5;
  VideoTrack track{{0, 1, -1, 0, 480, 0}, true, {}};
  track.formatDescriptions.push_back({640, 480, 4, 3, std::nullopt});
  track.formatDescriptions.push_back({720, 576, 1, 1, CleanAperture{704, 576, -1.5, 0}});
  movie.videoTracks = {track, VideoTrack{}};
  movie.metadata = {{"make", "A Maker"}, {"identifier", ""}};
  return movie;
}

TEST(MovieDescriptionTest, WhatIsDecodedIsWhatWasEncoded) {
  for (const MovieDescription& movie : {example(), MovieDescription{}}) {
    EXPECT_EQ(decodeMovieDescription(encodeMovieDescription(movie)), movie);
  }
}

TEST(MovieDescriptionTest, NothingShorterOrLongerIsDecoded) {
  std::vector<std::byte> bytes = encodeMovieDescription(example());
  for (std::size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_FALSE(decodeMovieDescription(std::span(bytes).first(length))) << length;
  }
  bytes.push_back(std::byte{0});
  EXPECT_FALSE(decodeMovieDescription(bytes));
}

TEST(MovieDescriptionTest, CountsBeyondTheLimitsAreRefused) {
  const std::vector<std::byte> none = encodeMovieDescription({});
  ASSERT_EQ(none.size(), 12u);  // no duration, no tracks, no items
  for (const std::size_t place : {0u, 4u, 8u}) {
    std::vector<std::byte> many = none;
    many[place + 3] = std::byte{0x7F};
    EXPECT_FALSE(decodeMovieDescription(many)) << place;
  }
}

TEST(MovieDescriptionTest, NumbersThatAreNoneAreRefused) {
  MovieDescription movie;
  movie.duration = std::numeric_limits<double>::quiet_NaN();
  EXPECT_FALSE(decodeMovieDescription(encodeMovieDescription(movie)));
  movie.duration = std::numeric_limits<double>::infinity();
  EXPECT_FALSE(decodeMovieDescription(encodeMovieDescription(movie)));
}

TEST(MovieDescriptionTest, PixelsWithoutASideAreRefused) {
  MovieDescription movie = example();
  movie.videoTracks[0].formatDescriptions[0].verticalSpacing = 0;
  EXPECT_FALSE(decodeMovieDescription(encodeMovieDescription(movie)));
}

TEST(MovieDescriptionTest, WhatIsBeyondTheLimitsIsLeftOut) {
  MovieDescription movie;
  movie.videoTracks.resize(1000);
  movie.metadata.assign(1000, {"make", std::string(10'000, 'x')});
  const auto kept = decodeMovieDescription(encodeMovieDescription(movie));
  ASSERT_TRUE(kept);
  EXPECT_EQ(kept->videoTracks.size(), 256u);
  EXPECT_EQ(kept->metadata.size(), 256u);
  EXPECT_EQ(kept->metadata[0].value.size(), 4096u);
}

TEST(PresentationDimensionsTest, ApplyTheCleanApertureAndTheShapeOfPixels) {
  VideoFormatDescription format{720, 576, 1, 1, std::nullopt};
  EXPECT_EQ(presentationDimensions(format), (VideoDimensions{720, 576}));
  format.horizontalSpacing = 64;
  format.verticalSpacing = 45;
  EXPECT_EQ(presentationDimensions(format), (VideoDimensions{1024, 576}));
  format.cleanAperture = CleanAperture{675, 570, 0, 0};
  EXPECT_EQ(presentationDimensions(format), (VideoDimensions{960, 570}));
}

}  // namespace
}  // namespace brivo
