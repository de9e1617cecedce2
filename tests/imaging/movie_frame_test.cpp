// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>

#include "imaging/jpeg_encoder.h"
#include "imaging/local_movie_reader.h"
#include "imaging/made_movies.h"
#include "imaging/made_pictures.h"
#include "imaging/movie_bytes.h"
#include "imaging/movie_request.h"
#include "iso_bytes.h"
#include "reading.h"
#include "support/open_file.h"

namespace brivo::imaging {
namespace {

using images::CountingSource;
using images::MemorySource;
using test::cleanApertureBox;
using test::MadeMovie;
using test::MovieBytes;
using test::pixelShapeBox;
using test::TrackBytes;

std::optional<Picture> frameOf(const std::string& file, MaximumSize maximum = {}) {
  return firstFrameOf(MemorySource(std::as_bytes(std::span(file))), maximum);
}

/// With one picture, in a track as `track` says.
std::string movieOf(TrackBytes track) {
  track.samples = {test::madeJpeg(track.width, track.height)};
  return MovieBytes{.tracks = {track}}.build();
}

testing::AssertionResult hasSize(const std::optional<Picture>& picture, int width, int height) {
  if (!picture) return testing::AssertionFailure() << "no picture";
  const auto& [w, h] = std::pair(picture->frame->width, picture->frame->height);
  if (w == width && h == height) return testing::AssertionSuccess();
  return testing::AssertionFailure() << w << " by " << h;
}

std::uint8_t luma(const AVFrame& frame, int x, int y) {
  return frame.data[0][static_cast<std::ptrdiff_t>(frame.linesize[0]) * y + x];
}

TEST(MovieFrameTest, ThePictureFitsIntoBothBounds) {
  const std::string movie = movieOf({.width = 640, .height = 480});
  EXPECT_TRUE(hasSize(frameOf(movie, {160, 0}), 160, 120));
  EXPECT_TRUE(hasSize(frameOf(movie, {160, 12'960}), 160, 120));
  EXPECT_TRUE(hasSize(frameOf(movie, {0, 48}), 64, 48));
  EXPECT_TRUE(hasSize(frameOf(movie, {160, 30}), 40, 30));
  EXPECT_TRUE(hasSize(frameOf(movie, {1, 1}), 1, 1));
}

TEST(MovieFrameTest, ItIsNeverEnlarged) {
  EXPECT_TRUE(hasSize(frameOf(movieOf({}), {1024, 12'960}), 64, 48));
}

TEST(MovieFrameTest, WithoutBoundsItIsWhole) { EXPECT_TRUE(hasSize(frameOf(movieOf({}), {0, 0}), 64, 48)); }

TEST(MovieFrameTest, TheTransformIsNotApplied) {
  EXPECT_TRUE(hasSize(frameOf(movieOf({.matrix = test::matrixOf(0, 1, -1, 0, 48, 0)})), 64, 48));
}

TEST(MovieFrameTest, PixelsThatAreNotSquareAreMadeSo) {
  EXPECT_TRUE(hasSize(frameOf(movieOf({.entryBoxes = pixelShapeBox(2, 1)})), 128, 48));
  EXPECT_TRUE(hasSize(frameOf(movieOf({.entryBoxes = pixelShapeBox(2, 1)}), {64, 0}), 64, 24));
}

TEST(MovieFrameTest, OnlyTheCleanApertureIsShown) {
  const auto whole = frameOf(movieOf({}));
  const auto part = frameOf(movieOf({.entryBoxes = cleanApertureBox(32, 24, 8, -4)}));
  ASSERT_TRUE(hasSize(part, 32, 24));
  // Of 64 by 48: from 16 + 8 and 12 - 4 on.
  for (const auto& [x, y] : {std::pair(0, 0), std::pair(31, 0), std::pair(0, 23), std::pair(31, 23)}) {
    EXPECT_NEAR(luma(*part->frame, x, y), luma(*whole->frame, x + 24, y + 8), 2) << x << " " << y;
  }
}

TEST(MovieFrameTest, PixelsOfMonstrousShapeCostNothing) {
  EXPECT_FALSE(frameOf(movieOf({.entryBoxes = pixelShapeBox(0xFFFFFFFF, 1)})));
  EXPECT_TRUE(hasSize(frameOf(movieOf({.entryBoxes = pixelShapeBox(0xFFFFFFFF, 1)}), {160, 0}), 160, 1));
  EXPECT_TRUE(frameOf(movieOf({.entryBoxes = pixelShapeBox(1, 0xFFFFFFFF)}), {160, 0}));
}

std::string blackJpeg(std::uint32_t width, std::uint32_t height) {
  Picture black{makeFrame(AV_PIX_FMT_GRAY8, width, height), {}};
  std::fill_n(black.frame->data[0], static_cast<std::size_t>(black.frame->linesize[0]) * height, 0);
  const auto bytes = encodeJpeg(black);
  return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

TEST(MovieFrameTest, WhatLiesBeforeTheFirstEditIsNotShown) {
  TrackBytes track{.samples = {}};
  for (int i = 0; i < 3; ++i) track.samples.push_back(blackJpeg(64, 48));
  for (int i = 0; i < 5; ++i) track.samples.push_back(test::madeJpeg(64, 48));
  const auto isBright = [](const TrackBytes& shown) {
    const auto picture = frameOf(MovieBytes{.tracks = {shown}}.build());
    return picture && luma(*picture->frame, 60, 24) > 200;
  };
  EXPECT_FALSE(isBright(track));
  track.editBox = test::editBox(5, 3);
  EXPECT_TRUE(isBright(track));
}

TEST(MovieFrameTest, PicturesBeforeTheFirstEditThatOthersBuildOnAreNotShown) {
  const std::string movie = test::madeMovie({.container = "mov", .encoder = "libx264", .frames = 20});
  std::string edited = movie;
  const std::size_t edits = edited.find("elst");
  ASSERT_NE(edits, std::string::npos);
  // ISO/IEC 14496-12 section 8.6.6: where the first edit begins. The muxer counts 12,800 units a second.
  const std::size_t start = edits + 4 + 4 + 4 + 4;
  constexpr unsigned unitsOf10Pictures = 5120;
  edited.replace(start, 4, test::big(unitsOf10Pictures, 4));
  const auto first = frameOf(movie);
  const auto later = frameOf(edited);
  ASSERT_TRUE(first && later);
  EXPECT_GT(luma(*later->frame, 32, 24), luma(*first->frame, 32, 24) + 10) << "each is brighter by 2";
}

TEST(MovieFrameTest, OfThousandsOfPicturesBeforeTheFirstEditNoneIsWaitedFor) {
  const std::string sample = test::madeMovie({.container = "m4v", .encoder = "mpeg4", .frames = 1});
  const auto shows = [&](unsigned start) {
    const TrackBytes track{.format = "mp4v",
                           .samples = {sample},
                           .listings = start + 10,
                           .isFirstAloneWhole = true,
                           .editBox = test::editBox(10, start)};
    return frameOf(MovieBytes{.tracks = {track}}.build()).has_value();
  };
  EXPECT_TRUE(shows(2000));
  EXPECT_FALSE(shows(6000));
}

TEST(MovieFrameTest, PacketsThatShareTheirBytesHaveALimitToo) {
  const std::string file =
      MovieBytes{.tracks = {{.samples = {std::string(100, 's')}, .listings = 200'000}}}.build();
  const MemorySource source(std::as_bytes(std::span(file)));
  const auto input = MovieInput::open(source);
  ASSERT_TRUE(input);
  input->readOnly(*input->container().streams[0]);
  std::size_t count = 0;
  while (const Packet packet = input->next()) ++count;
  constexpr std::size_t most = std::size_t{64} << 20;
  EXPECT_GT(count, most / 1000);
  EXPECT_LT(count, most / 500);
}

TEST(MovieFrameTest, OfSeveralVideoTracksTheFirstIsShown) {
  const MovieBytes movie{
      .tracks = {{.handler = "soun", .format = "sowt", .samples = {std::string(100, '\0')}},
                 {.width = 32, .height = 16, .samples = {test::madeJpeg(32, 16)}},
                 {.width = 128, .height = 96, .samples = {test::madeJpeg(128, 96)}}}};
  EXPECT_TRUE(hasSize(frameOf(movie.build()), 32, 16));
}

TEST(MovieFrameTest, ACoverIsNotTheFirstPicture) {
  const MovieBytes movie{.tracks = {{.samples = {blackJpeg(64, 48)}}},
                         .userData = test::coverBox(test::madeJpeg(64, 48))};
  const auto picture = frameOf(movie.build());
  ASSERT_TRUE(hasSize(picture, 64, 48));
  EXPECT_LT(luma(*picture->frame, 60, 24), 20);
}

TEST(MovieFrameTest, SoundAloneShowsNothing) {
  EXPECT_FALSE(frameOf(MovieBytes{.tracks = {{.handler = "soun", .format = "sowt"}}}.build()));
}

TEST(MovieFrameTest, ATrackWithoutPicturesShowsNothing) {
  EXPECT_FALSE(frameOf(MovieBytes{.tracks = {{.samples = {}}}}.build()));
}

TEST(MovieFrameTest, EncryptedOrUnknownPicturesAreNotShown) {
  EXPECT_FALSE(frameOf(movieOf({.format = "zzzz"})));
  const std::string protection = test::box("sinf", test::box("frma", "jpeg"));
  EXPECT_FALSE(frameOf(movieOf({.format = "encv", .entryBoxes = protection})));
}

TEST(MovieFrameTest, ABrokenPictureIsPassedOver) {
  TrackBytes track;
  track.samples = {std::string(500, 'x'), test::madeJpeg(64, 48)};
  EXPECT_TRUE(hasSize(frameOf(MovieBytes{.tracks = {track}}.build()), 64, 48));
}

TEST(MovieFrameTest, ARecordingThatIsCutShortShowsWhatIsThere) {
  for (const char* container : {"avi", "mpegts", "matroska", "vob"}) {
    const char* encoder = std::string_view(container) == "avi" ? "mpeg4" : "mpeg2video";
    const std::string file = test::madeMovie(
        {.container = container, .encoder = encoder, .width = 320, .height = 240, .frames = 50});
    EXPECT_TRUE(hasSize(frameOf(file.substr(0, file.size() / 2)), 320, 240)) << container;
  }
}

TEST(MovieFrameTest, ARecordingThatBeginsInTheMiddleIsShownFromItsFirstWholePictureOn) {
  const std::string file = test::madeMovie({.container = "mpegts", .encoder = "mpeg2video", .frames = 50});
  constexpr std::size_t packet = 188;  // ISO/IEC 13818-1
  EXPECT_TRUE(hasSize(frameOf(file.substr(file.size() / 2 / packet * packet)), 64, 48));
}

TEST(MovieFrameTest, OfSoundThatWasReadToFindTheTracksNothingIsLeft) {
  for (const auto& [container, encoder] :
       {std::pair("flv", "flv"), std::pair("mpegts", "mpeg2video"), std::pair("vob", "mpeg2video")}) {
    const std::string file =
        test::madeMovie({.container = container, .encoder = encoder, .frames = 50, .hasSound = true});
    const MemorySource source(std::as_bytes(std::span(file)));
    const auto input = MovieInput::open(source);
    ASSERT_TRUE(input) << container;
    input->completeStreams();
    const auto streams = std::span(input->container().streams, input->container().nb_streams);
    ASSERT_EQ(streams.size(), 2u) << container;
    const AVStream& video = isVideo(*streams[0]) ? *streams[0] : *streams[1];
    input->readOnly(video);
    int pictures = 0;
    for (; const Packet packet = input->next(); ++pictures)
      ASSERT_EQ(packet->stream_index, video.index) << container;
    EXPECT_EQ(pictures, 50) << container;
  }
}

TEST(MovieFrameTest, CodecsThatCanHalveGiveTheSamePicture) {
  for (const char* encoder : {"mpeg4", "mpeg2video"}) {
    const std::string file =
        test::madeMovie({.container = "avi", .encoder = encoder, .width = 1280, .height = 960, .frames = 1});
    const auto picture = frameOf(file, {160, 0});
    ASSERT_TRUE(hasSize(picture, 160, 120)) << encoder;
    EXPECT_LT(test::meanDifference(*picture->frame, *test::madeFrame(160, 120)), 5) << encoder;
  }
}

TEST(MovieFrameTest, HighDefinitionIsInItsOwnColours) {
  // The same samples mean other colours in ITU-R BT.709 than in BT.601: blue and green weigh otherwise.
  const auto blueInCorner = [](std::uint32_t width, std::uint32_t height) {
    const auto picture = frameOf(
        test::madeMovie({.container = "mov", .encoder = "libx264", .width = width, .height = height}));
    return picture ? int{picture->frame->data[1][0]} : 0;
  };
  const int standard = blueInCorner(640, 360);
  EXPECT_NEAR(standard, 200, 5);
  EXPECT_GT(std::abs(blueInCorner(1280, 720) - standard), 3);
}

TEST(MovieFrameTest, NothingIsReadWithoutEnd) {
  // Pictures that none of them decodes, for as long as the file claims.
  TrackBytes track;
  track.samples.assign(200, std::string(1'000'000, 'x'));
  const CountingSource source(MovieBytes{.tracks = {track}}.build());
  EXPECT_FALSE(firstFrameOf(source, {160, 0}));
  EXPECT_LT(source.bytesRead(), std::size_t{70} << 20);
}

/// A stream without a header that does not say the size of its pictures either.
TEST(MovieFrameTest, AStreamThatKeepsItsSizeToItselfShowsNothing) {
  const std::string file = test::readFile(BRIVOD_SOURCE_DIR "/fuzz/seeds/decode_movie/unknown_size.mts");
  const MemorySource source(std::as_bytes(std::span(file)));
  const auto movie = describeMovie(source);
  ASSERT_TRUE(movie && movie->videoTracks.size() == 1);
  EXPECT_TRUE(movie->videoTracks[0].formatDescriptions.empty());
  EXPECT_FALSE(firstFrameOf(source, {160, 0}));
}

TEST(MovieFrameTest, TheReaderGivesAJpeg) {
  LocalMovieReader reader;
  const auto jpeg = reader.firstFrame(test::fileWith(movieOf({.width = 640, .height = 480})), {160, 0});
  ASSERT_TRUE(jpeg);
  const auto properties = images::copySequentialProperties(MemorySource(jpeg->bytes()));
  ASSERT_TRUE(properties);
  EXPECT_EQ(properties->size.width, 160u);
  EXPECT_EQ(properties->size.height, 120u);
}

TEST(MovieFrameTest, AMovieWithAnyOtherByteIsBounded) {
  const std::string file = movieOf({.entryBoxes = cleanApertureBox(60, 40, 0, 0) + pixelShapeBox(4, 3)});
  for (std::size_t place = 0; place < file.size(); ++place) {
    for (const char other : {'\0', '\xFF'}) {
      std::string changed = file;
      changed[place] = other;
      const CountingSource source(changed);
      const auto picture = firstFrameOf(source, {160, 160});
      ASSERT_TRUE(!picture || (picture->frame->width <= 160 && picture->frame->height <= 160)) << place;
      ASSERT_LT(source.bytesRead(), std::size_t{70} << 20) << place;
    }
  }
}

}  // namespace
}  // namespace brivo::imaging
