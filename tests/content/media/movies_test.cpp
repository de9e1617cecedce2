// SPDX-License-Identifier: MIT
// Movies as items: what the catalogue, the metadata and the thumbnails show of them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fmt/core.h>
#include <cmath>

#include <chrono>
#include <filesystem>
#include <numbers>
#include <thread>

#include "content/media/video_orientation.h"
#include "content/recording_device.h"
#include "imaging/made_pictures.h"
#include "imaging/movie_bytes.h"
#include "iso_bytes.h"
#include "platform/images/image_reader.h"
#include "support/standard_error.h"
#include "support/temporary_folder.h"
#include "util/log.h"

namespace brivo {
namespace {

using test::matrixOf;
using test::MovieBytes;
using test::TrackBytes;
using testing::HasSubstr;
using testing::Not;

/// A track whose transform turns by so many degrees.
std::vector<VideoTrack> turnedBy(double degrees) {
  const double angle = degrees * std::numbers::pi / 180;
  return {{{std::cos(angle), std::sin(angle), -std::sin(angle), std::cos(angle), 0, 0}, true, {}}};
}

TEST(VideoOrientationTest, WholeDegreesDecide) {
  EXPECT_EQ(videoOrientation(turnedBy(0)), 1u);
  EXPECT_EQ(videoOrientation(turnedBy(45)), 1u);
  EXPECT_EQ(videoOrientation({{{0, 1, -1, 0, 0, 0}, true, {}}}), 6u);
  EXPECT_EQ(videoOrientation({{{-1, 0, 0, -1, 0, 0}, true, {}}}), 8u);
  EXPECT_EQ(videoOrientation({{{0, -1, 1, 0, 0, 0}, true, {}}}), 4u);
}

TEST(VideoOrientationTest, OfMirroredPicturesTheTurnOfTheUpperBorderCounts) {
  EXPECT_EQ(videoOrientation({{{-1, 0, 0, 1, 640, 0}, true, {}}}), 8u) << "left to right";
  EXPECT_EQ(videoOrientation({{{1, 0, 0, -1, 0, 480}, true, {}}}), 1u) << "top to bottom";
  EXPECT_EQ(videoOrientation({{{0, 1, 1, 0, 0, 0}, true, {}}}), 6u) << "lines for columns";
  EXPECT_EQ(videoOrientation({{{0, -1, -1, 0, 480, 640}, true, {}}}), 4u) << "and turned by half a turn";
}

TEST(VideoOrientationTest, AngleFractionsAreCutOff) {
  EXPECT_EQ(videoOrientation(turnedBy(89.9)), 1u);
  EXPECT_EQ(videoOrientation(turnedBy(90.4)), 6u);
  EXPECT_EQ(videoOrientation(turnedBy(-89.9)), 1u);
  EXPECT_EQ(videoOrientation(turnedBy(-90.4)), 4u);
}

TEST(VideoOrientationTest, OfNoTrackThereIsNone) { EXPECT_EQ(videoOrientation({}), 0u); }

TEST(VideoOrientationTest, ATransformOfZerosIsUpright) { EXPECT_EQ(videoOrientation({VideoTrack()}), 1u); }

TEST(VideoOrientationTest, TheFirstTrackDecides) {
  EXPECT_EQ(videoOrientation({turnedBy(0).front(), {{0, 1, -1, 0, 0, 0}, true, {}}}), 1u);
}

class MoviesTest : public testing::Test {
 protected:
  MoviesTest() { OVLoggingLevel = kLogTypeContent; }
  ~MoviesTest() override { OVLoggingLevel = 0; }

  std::shared_ptr<BrivoFile> add(const std::string& content, const std::string& name = "MVI_0001.MOV") {
    test::writeFile(card / name, content);
    return BrivoFile::initWithFSURL(card / name, name, nullptr, *device);
  }
  /// With a real picture in each track.
  static std::string movieOf(std::vector<TrackBytes> tracks, std::string metaBox = {}) {
    for (TrackBytes& track : tracks) {
      if (track.handler == "vide") track.samples = {test::madeJpeg(track.width, track.height)};
    }
    return MovieBytes{.tracks = std::move(tracks), .metaBox = std::move(metaBox)}.build();
  }
  static TrackBytes turned(const test::TrackMatrix& matrix) {
    return {.width = 640, .height = 480, .matrix = matrix};
  }
  static Dictionary metadataOf(BrivoFile& file) {
    Dictionary metadata;
    file.metadataWithOptions({}, [&](Dictionary reply) { metadata = std::move(reply); });
    return metadata;
  }
  static Dictionary thumbnailOf(BrivoFile& file, std::uint32_t width) {
    Dictionary answer;
    file.thumbnailDataWithOptions(Dictionary{{"OVThumbnailMaxPixelSize", width}},
                                  [&](Dictionary reply) { answer = std::move(reply); });
    return answer;
  }
  static images::PixelSize sizeOf(const Data* jpeg) {
    if (!jpeg) return {};
    const auto properties = images::copySequentialProperties(images::MemorySource(jpeg->bytes()));
    return properties ? properties->size : images::PixelSize();
  }
  void expectShown(const test::TrackMatrix& matrix, std::uint32_t orientation, std::uint32_t width,
                   std::uint32_t height) {
    const auto file = add(movieOf({turned(matrix)}));
    EXPECT_EQ(file->imageOrientation(), orientation);
    EXPECT_EQ(file->imageWidth(), width);
    EXPECT_EQ(file->imageHeight(), height);
    EXPECT_EQ(metadataOf(*file).unsignedInteger("Orientation"), orientation);
  }

  test::TemporaryFolder card;
  std::shared_ptr<RecordingDevice> device = std::make_shared<RecordingDevice>();
};

TEST_F(MoviesTest, AQuarterTurnIsOrientation6WithWidthAndHeightSwapped) {
  expectShown(matrixOf(0, 1, -1, 0, 480, 0), 6, 480, 640);
}

TEST_F(MoviesTest, HalfATurnIsOrientation8WithWidthAndHeightSwapped) {
  expectShown(matrixOf(-1, 0, 0, -1, 640, 480), 8, 480, 640);
}

TEST_F(MoviesTest, AQuarterTurnCounterClockwiseIsOrientation4) {
  expectShown(matrixOf(0, -1, 1, 0, 0, 640), 4, 640, 480);
}

TEST_F(MoviesTest, MirroredPicturesAreSwappedLikeTurnedOnes) {
  expectShown(matrixOf(-1, 0, 0, 1, 640, 0), 8, 480, 640);
  expectShown(matrixOf(1, 0, 0, -1, 0, 480), 1, 640, 480);
  expectShown(matrixOf(0, 1, 1, 0), 6, 480, 640);
}

TEST_F(MoviesTest, WhereTheSizeIsSwappedTheDimensionsSayItToo) {
  const Dictionary turnedOne = metadataOf(*add(movieOf({turned(matrixOf(0, 1, -1, 0, 480, 0))})));
  for (const char* width : {"PixelWidth", "PixelXDimension"})
    EXPECT_EQ(turnedOne.unsignedInteger(width), 480u) << width;
  for (const char* height : {"PixelHeight", "PixelYDimension"})
    EXPECT_EQ(turnedOne.unsignedInteger(height), 640u) << height;
  const Dictionary upright = metadataOf(*add(movieOf({turned(matrixOf(1, 0, 0, 1))})));
  EXPECT_EQ(upright.unsignedInteger("PixelWidth"), 640u);
  EXPECT_FALSE(upright.find("PixelXDimension"));
  EXPECT_FALSE(upright.find("PixelYDimension"));
}

TEST_F(MoviesTest, TheIdentityIsOrientation1) { expectShown(matrixOf(1, 0, 0, 1), 1, 640, 480); }

TEST_F(MoviesTest, TheDurationIsInSecondsOfSinglePrecision) {
  const auto file = add(MovieBytes{.duration = 21, .tracks = {TrackBytes{}}}.build());
  EXPECT_EQ(metadataOf(*file).real("VideoDuration"), static_cast<double>(2.1F));
}

TEST_F(MoviesTest, SoundAloneHasOrientation0AndNoTracksAndNoThumbnail) {
  const std::string content = movieOf({{.handler = "soun", .format = "sowt"}});
  const test::StandardErrorCapture log;
  const auto file = add(content);
  EXPECT_EQ(file->imageOrientation(), 0u);
  EXPECT_EQ(metadataOf(*file).unsignedInteger("Orientation"), 0u);
  EXPECT_THAT(log.text(), HasSubstr("MovieAsset contains no tracks: MVI_0001.MOV"));
  EXPECT_FALSE(thumbnailOf(*file, 160).data("thumb"));
  EXPECT_THAT(log.text(), HasSubstr("failed to generate a preview thumbnail: MVI_0001.MOV"));
}

TEST_F(MoviesTest, MakeAndModelAreTiffEntries) {
  const auto file = add(movieOf({TrackBytes{}}, test::keysBox({{"org.example.make", "A Maker"},
                                                               {"org.example.model", "A Model"},
                                                               {"org.example.software", "7.1"},
                                                               {"org.example.content.identifier", "ID"}})));
  const Dictionary metadata = metadataOf(*file);
  const Dictionary* tiff = metadata.dictionary("{TIFF}");
  ASSERT_TRUE(tiff);
  EXPECT_EQ(*tiff->string("Make"), "A Maker");
  EXPECT_EQ(*tiff->string("Model"), "A Model");
  EXPECT_EQ(*tiff->string("Software"), "7.1");
  const Dictionary* maker = metadata.dictionary("{MakerNorel}");
  ASSERT_TRUE(maker);
  EXPECT_EQ(*maker->string("17"), "ID");
  EXPECT_EQ(maker->size(), 1u);
}

TEST_F(MoviesTest, WithoutSuchItemsTheDictionariesAreEmpty) {
  const Dictionary metadata = metadataOf(*add(movieOf({TrackBytes{}})));
  ASSERT_TRUE(metadata.dictionary("{TIFF}"));
  EXPECT_TRUE(metadata.dictionary("{TIFF}")->empty());
  ASSERT_TRUE(metadata.dictionary("{MakerNorel}"));
  EXPECT_TRUE(metadata.dictionary("{MakerNorel}")->empty());
}

TEST_F(MoviesTest, OfTwoItemsWithOneKeyTheLaterCounts) {
  const auto file = add(
      movieOf({TrackBytes{}}, test::keysBox({{"org.example.make", "First"}, {"org.other.make", "Second"}})));
  EXPECT_EQ(*metadataOf(*file).dictionary("{TIFF}")->string("Make"), "Second");
}

TEST_F(MoviesTest, TextThatIsNotUtf8IsMadeSo) {
  const auto file = add(movieOf({TrackBytes{}}, test::keysBox({{"org.example.make", "A\xFFMaker"}})));
  EXPECT_EQ(*metadataOf(*file).dictionary("{TIFF}")->string("Make"), "A\uFFFDMaker");
}

TEST_F(MoviesTest, OfLongTextTheWholeCharactersOf256BytesAreKept) {
  const auto kept = [&](const std::string& make) {
    const auto file = add(movieOf({TrackBytes{}}, test::keysBox({{"org.example.make", make}})));
    return *metadataOf(*file).dictionary("{TIFF}")->string("Make");
  };
  const auto replacements = [](std::size_t count) {
    std::string text;
    while (count-- > 0) text += "\uFFFD";
    return text;
  };
  EXPECT_EQ(kept(std::string(256, 'x')), std::string(256, 'x'));
  EXPECT_EQ(kept(std::string(4000, 'x')), std::string(256, 'x'));
  EXPECT_EQ(kept(std::string(4000, '\xFF')), replacements(85)) << "three bytes each";
  EXPECT_EQ(kept(std::string(255, 'x') + "\u00E9"), std::string(255, 'x'));
  EXPECT_EQ(kept(std::string(254, 'x') + "\u00E9"), std::string(254, 'x') + "\u00E9");
}

TEST_F(MoviesTest, SizesHaveTheShapeOfPixelsAndTheCleanAperture) {
  const auto file =
      add(movieOf({{.width = 320,
                    .height = 240,
                    .entryBoxes = test::pixelShapeBox(4, 3) + test::cleanApertureBox(301, 200, 0, 0)}}));
  EXPECT_EQ(metadataOf(*file).unsignedInteger("PixelWidth"), 401u) << "301 × 4/3 without its fraction";
  EXPECT_EQ(metadataOf(*file).unsignedInteger("PixelHeight"), 200u);
  EXPECT_EQ(file->imageWidth(), 401u);
}

TEST_F(MoviesTest, AnUndecodableTrackLeavesTheSizeOut) {
  const test::StandardErrorCapture log;
  const auto file = add(movieOf({TrackBytes{}, {.format = "zzzz"}}));
  EXPECT_THAT(log.text(), HasSubstr("MovieAsset is not decodable: MVI_0001.MOV"));
  EXPECT_FALSE(metadataOf(*file).find("PixelWidth"));
  EXPECT_TRUE(metadataOf(*file).find("VideoDuration"));
  EXPECT_EQ(file->imageWidth(), 0u);
}

TEST_F(MoviesTest, ATrackWithoutFormatLeavesTheSizeOut) {
  const test::StandardErrorCapture log;
  const auto file = add(MovieBytes{.tracks = {{.width = 0, .height = 0}}}.build());
  EXPECT_THAT(log.text(), HasSubstr("MovieAsset missing format descriptions: MVI_0001.MOV"));
  EXPECT_FALSE(metadataOf(*file).find("PixelHeight"));
}

TEST_F(MoviesTest, AMovieThatCannotBeReadHasItsOrientationAndEmptyDictionariesAlone) {
  const test::StandardErrorCapture log;
  const auto file = add("no movie at all");
  EXPECT_THAT(log.text(), HasSubstr("failed to return the duration: MVI_0001.MOV"));
  EXPECT_THAT(log.text(), HasSubstr("MovieAsset could not be loaded: MVI_0001.MOV"));
  EXPECT_EQ(metadataOf(*file),
            (Dictionary{{"Orientation", 0u}, {"{TIFF}", Dictionary()}, {"{MakerNorel}", Dictionary()}}));
  EXPECT_EQ(file->thumbSize(), 1u) << "it may have a thumbnail";
  EXPECT_TRUE(file->updatedBasicMetadata());
  EXPECT_FALSE(thumbnailOf(*file, 160).data("thumb"));
}

/// A medium of which nothing can be read any more.
class NoFiles final : public FileSystem {
 public:
  Result<ResourceValues> resourceValues(const std::string& path) override {
    return systemFiles().resourceValues(path);
  }
  Result<std::vector<std::string>> names(const std::string&) override { return failed(); }
  Result<std::vector<DirectoryEntry>> entries(const std::string&) override { return failed(); }
  Result<UniqueFd> open(const std::string&) override { return failed(); }
  std::int64_t read(int, std::span<std::byte>, std::uint64_t) override { return -1; }
  std::optional<SystemError> remove(const std::string&) override { return failed(); }

 private:
  static SystemError failed() { return {"read the medium", EIO}; }
};

TEST_F(MoviesTest, AMovieThatCannotBeOpenedHasItsOrientationAlone) {
  NoFiles broken;
  device->fileSystem = &broken;
  const auto file = add(movieOf({TrackBytes{}}));
  EXPECT_EQ(metadataOf(*file), (Dictionary{{"Orientation", 0u}}));
  EXPECT_FALSE(thumbnailOf(*file, 160).data("thumb"));
}

TEST_F(MoviesTest, LogLinesAreForThoseWhoWantThem) {
  OVLoggingLevel = 0;
  const test::StandardErrorCapture log;
  (void)add("no movie at all");
  EXPECT_THAT(log.text(), Not(HasSubstr("MovieAsset")));
}

TEST_F(MoviesTest, TheThumbnailIsTheFirstFrameInTheWantedWidthAsItIsStored) {
  const auto file = add(movieOf({turned(matrixOf(0, 1, -1, 0, 480, 0))}));
  const test::StandardErrorCapture log;
  const Dictionary reply = thumbnailOf(*file, 160);
  EXPECT_EQ(sizeOf(reply.data("thumb")), (images::PixelSize{160, 120}));
  EXPECT_EQ(reply.unsignedInteger("Orientation"), 6u);
  EXPECT_TRUE(reply.dictionary("metadata"));
  EXPECT_THAT(log.text(), HasSubstr("[ExFATCamera thumbData] file://" + card / "MVI_0001.MOV"));
}

/// Keeps what was asked for.
class AskedReader final : public MovieReader {
 public:
  std::optional<MovieDescription> describe(const UniqueFd&) override {
    MovieDescription movie;
    movie.duration = 1;
    movie.videoTracks.push_back({AffineTransform::identity(), true, {{1920, 1080, 1, 1, std::nullopt}}});
    return movie;
  }
  std::optional<Data> firstFrame(const UniqueFd&, MaximumSize maximum) override {
    asked = maximum;
    return Data::copyOf("\xFF\xD8");
  }
  MaximumSize asked;
};

class AskedDevice final : public RecordingDevice {
 public:
  MovieService& movies() const override { return service; }
  AskedReader reader;
  mutable MovieService service{reader, 1, 1};
};

TEST_F(MoviesTest, A1920By1080MovieAskedForWidth160IsBoundedBy160By12960) {
  const auto asked = std::make_shared<AskedDevice>();
  test::writeFile(card / "MVI_0002.MOV", "x");
  const auto file = BrivoFile::initWithFSURL(card / "MVI_0002.MOV", "MVI_0002.MOV", nullptr, *asked);
  EXPECT_TRUE(thumbnailOf(*file, 160).data("thumb"));
  EXPECT_EQ(asked->reader.asked.width, 160u);
  EXPECT_EQ(asked->reader.asked.height, 12'960u);
}

TEST_F(MoviesTest, AskedForMoreThanItsWidthAMovieShowsLess) {
  const auto thumbnailSize = [&](unsigned width, unsigned height, std::uint32_t wanted) {
    const auto file = add(movieOf({{.width = width, .height = height}}));
    return sizeOf(thumbnailOf(*file, wanted).data("thumb"));
  };
  EXPECT_EQ(thumbnailSize(1920, 1080, 1920), (images::PixelSize{1920, 1080}));
  EXPECT_EQ(thumbnailSize(1920, 1080, 3840), (images::PixelSize{960, 540}));
  EXPECT_EQ(thumbnailSize(320, 240, 1024), (images::PixelSize{100, 75}));
}

TEST_F(MoviesTest, AFolderOfSlowMoviesLetsOtherFoldersIn) {
  class SlowReader final : public MovieReader {
   public:
    std::optional<MovieDescription> describe(const UniqueFd&) override {
      const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(25);
      while (std::chrono::steady_clock::now() < end) std::this_thread::yield();
      return std::nullopt;
    }
    std::optional<Data> firstFrame(const UniqueFd&, MaximumSize) override { return std::nullopt; }
  };
  class SlowDevice final : public RecordingDevice {
   public:
    MovieService& movies() const override { return service; }
    SlowReader reader;
    mutable MovieService service{reader, 1, 1};
  };
  const auto slow = std::make_shared<SlowDevice>();
  for (int i = 1; i <= 5; ++i) test::writeFile(card / fmt::format("100MOVIE/MVI_000{}.MOV", i), "x");
  test::writeFile(card / "101OTHER/NOTE0001.TXT", "x");
  for (const char* name : {"100MOVIE", "101OTHER"}) {
    BrivoFolder::initWithFSURL(card / name, name, nullptr, *slow)->enumerateContentWithOptions({});
  }
  slow->run();
  const auto batches = slow->batchNames();
  ASSERT_EQ(batches.size(), 6u);
  EXPECT_EQ(batches[1], std::vector<std::string>{"NOTE0001.TXT"});
}

TEST_F(MoviesTest, AWantedWidthOf0TakesTheWholeSize) {
  EXPECT_EQ(sizeOf(thumbnailOf(*add(movieOf({{.width = 640, .height = 480}})), 0).data("thumb")),
            (images::PixelSize{640, 480}));
}

TEST_F(MoviesTest, AMovieOfUnknownSizeIsBoundedByItsWidthAlone) {
  const auto file = add(movieOf({TrackBytes{.width = 640, .height = 480}, {.format = "zzzz"}}));
  ASSERT_EQ(file->imageWidth(), 0u);
  EXPECT_EQ(sizeOf(thumbnailOf(*file, 160).data("thumb")), (images::PixelSize{160, 120}));
}

TEST_F(MoviesTest, WhatIsNeitherImageNorMovieHasNoThumbnail) {
  EXPECT_FALSE(thumbnailOf(*add("text", "NOTES.TXT"), 160).data("thumb"));
  EXPECT_FALSE(thumbnailOf(*add(std::string(100, '\0'), "SND_0001.WAV"), 160).data("thumb"));
}

TEST_F(MoviesTest, ItsDictionaryStaysWhenTheFileGoes) {
  const auto file = add(movieOf({TrackBytes{}}));
  const Dictionary before = metadataOf(*file);
  std::filesystem::remove(card / "MVI_0001.MOV");
  EXPECT_EQ(metadataOf(*file), before);
  EXPECT_FALSE(thumbnailOf(*file, 160).data("thumb"));
}

}  // namespace
}  // namespace brivo
