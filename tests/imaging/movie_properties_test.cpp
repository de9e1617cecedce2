// SPDX-License-Identifier: MIT
// What movies say of themselves, in made-up files and in those of real muxers.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include "imaging/descriptor_source.h"
#include "imaging/made_movies.h"
#include "imaging/made_pictures.h"
#include "imaging/movie_bytes.h"
#include "imaging/movie_request.h"
#include "iso_bytes.h"
#include "platform/movies/movie_description.h"
#include "reading.h"
#include "support/temporary_folder.h"

namespace brivo::imaging {
namespace {

using images::CountingSource;
using images::MemorySource;
using test::cleanApertureBox;
using test::MadeMovie;
using test::matrixOf;
using test::MovieBytes;
using test::pixelShapeBox;
using test::TrackBytes;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::uint64_t kMostBesidesIndex = 2'097'152;

std::optional<MovieDescription> describe(const std::string& file) {
  return describeMovie(MemorySource(std::as_bytes(std::span(file))));
}

/// Of a file with one track.
VideoTrack trackOf(const TrackBytes& track) {
  const auto movie = describe(MovieBytes{.tracks = {track}}.build());
  EXPECT_TRUE(movie && movie->videoTracks.size() == 1);
  return movie && !movie->videoTracks.empty() ? movie->videoTracks.front() : VideoTrack();
}

VideoDimensions shown(const TrackBytes& track) {
  return presentationDimensions(trackOf(track).formatDescriptions.at(0));
}

TEST(MoviePropertiesTest, TheTransformIsTheMatrixOfTheTrack) {
  struct Turn {
    test::TrackMatrix matrix;
    AffineTransform transform;
  };
  for (const auto& [matrix, transform] : {Turn{matrixOf(1, 0, 0, 1), AffineTransform::identity()},
                                          Turn{matrixOf(0, 1, -1, 0, 48, 0), {0, 1, -1, 0, 48, 0}},
                                          Turn{matrixOf(-1, 0, 0, -1, 64, 48), {-1, 0, 0, -1, 64, 48}},
                                          Turn{matrixOf(0, -1, 1, 0, 0, 64), {0, -1, 1, 0, 0, 64}},
                                          Turn{matrixOf(-1, 0, 0, 1, 64, 0), {-1, 0, 0, 1, 64, 0}},
                                          Turn{matrixOf(0, 1, 1, 0), {0, 1, 1, 0, 0, 0}}}) {
    EXPECT_EQ(trackOf({.matrix = matrix}).preferredTransform, transform) << transform.a << transform.b;
  }
}

TEST(MoviePropertiesTest, FractionsOfTheMatrixAreThereToo) {
  test::TrackMatrix matrix = matrixOf(0, 0, 0, 0);
  matrix[0] = test::kOne16 / 2;
  matrix[1] = -test::kOne16 / 4;
  EXPECT_EQ(trackOf({.matrix = matrix}).preferredTransform, (AffineTransform{0.5, -0.25, 0, 0, 0, 0}));
}

TEST(MoviePropertiesTest, TheCleanApertureIsWhatIsShown) {
  EXPECT_EQ(shown({.entryBoxes = cleanApertureBox(60, 40, 0, 0)}), (VideoDimensions{60, 40}));
}

TEST(MoviePropertiesTest, PixelsThatAreNotSquareChangeTheWidth) {
  EXPECT_EQ(shown({.entryBoxes = pixelShapeBox(4, 3)}), (VideoDimensions{64 * 4.0 / 3, 48}));
}

TEST(MoviePropertiesTest, BothAreApplied) {
  const TrackBytes track{.entryBoxes = pixelShapeBox(2, 1) + cleanApertureBox(60, 40, 1, -1)};
  EXPECT_EQ(shown(track), (VideoDimensions{120, 40}));
}

TEST(MoviePropertiesTest, ACleanApertureBeyondThePictureDoesNotCount) {
  for (const auto& box : {cleanApertureBox(65, 48, 0, 0), cleanApertureBox(60, 48, 3, 0),
                          cleanApertureBox(-60, 48, 0, 0), cleanApertureBox(60, 40, 0, 1'000'000)}) {
    EXPECT_EQ(shown({.entryBoxes = box}), (VideoDimensions{64, 48}));
  }
}

TEST(MoviePropertiesTest, PixelsWithoutASideCountAsSquare) {
  EXPECT_EQ(shown({.entryBoxes = pixelShapeBox(0, 3)}), (VideoDimensions{64, 48}));
  EXPECT_EQ(shown({.entryBoxes = pixelShapeBox(3, 0)}), (VideoDimensions{64, 48}));
}

TEST(MoviePropertiesTest, TheTracksAreInOrderAndSoundIsNone) {
  const MovieBytes movie{.tracks = {{.handler = "soun", .format = "sowt"},
                                    {.width = 32, .height = 16},
                                    {.width = 128, .height = 96}}};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  ASSERT_EQ(found->videoTracks.size(), 2u);
  EXPECT_EQ(found->videoTracks[0].formatDescriptions.at(0).width, 32u);
  EXPECT_EQ(found->videoTracks[1].formatDescriptions.at(0).width, 128u);
}

TEST(MoviePropertiesTest, EachTrackHasItsOwnCleanAperture) {
  const MovieBytes movie{.tracks = {{.entryBoxes = cleanApertureBox(60, 40, 0, 0)},
                                    {.entryBoxes = cleanApertureBox(20, 10, 0, 0)}}};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  ASSERT_EQ(found->videoTracks.size(), 2u);
  EXPECT_EQ(found->videoTracks[1].formatDescriptions.at(0).cleanAperture->width, 20);
}

TEST(MoviePropertiesTest, AMovieWithSoundAloneHasNoVideoTrack) {
  const MovieBytes movie{.tracks = {{.handler = "soun", .format = "sowt"}}};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  EXPECT_THAT(found->videoTracks, IsEmpty());
  EXPECT_EQ(found->duration, 2);
}

TEST(MoviePropertiesTest, ACoverIsNoVideoTrack) {
  const MovieBytes movie{.brand = "M4A ",
                         .tracks = {{.handler = "soun", .format = "sowt"}},
                         .userData = test::coverBox(test::madeJpeg(32, 32))};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  EXPECT_THAT(found->videoTracks, IsEmpty());
}

TEST(MoviePropertiesTest, CommonItemsComeFromAnyKeyThatEndsInTheirName) {
  const MovieBytes movie{.tracks = {TrackBytes{}},
                         .metaBox = test::keysBox({{"org.example.make", "A Maker"},
                                                   {"org.example.Model", "A Model"},
                                                   {"software", "7.1"},
                                                   {"org.example.content.identifier", "THE-ID"},
                                                   {"org.example.modelnumber", "no"},
                                                   {"identifier", "no"}})};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  EXPECT_THAT(found->metadata,
              ElementsAre(MovieMetadataItem{"make", "A Maker"}, MovieMetadataItem{"model", "A Model"},
                          MovieMetadataItem{"software", "7.1"}, MovieMetadataItem{"identifier", "THE-ID"}));
}

TEST(MoviePropertiesTest, UserDataOfQuickTimeNamesMakeAndModelButNoSoftware) {
  const MovieBytes movie{.tracks = {TrackBytes{}},
                         .userData = test::userText("mak", "A Maker") + test::userText("mod", "A Model") +
                                     test::userText("swr", "7.1")};
  const auto found = describe(movie.build());
  ASSERT_TRUE(found);
  EXPECT_THAT(found->metadata,
              ElementsAre(MovieMetadataItem{"make", "A Maker"}, MovieMetadataItem{"model", "A Model"}));
}

TEST(MoviePropertiesTest, AMovieOfNoTimeHasADurationOfNothing) {
  const auto found = describe(MovieBytes{.duration = 0, .tracks = {TrackBytes{}}}.build());
  ASSERT_TRUE(found);
  EXPECT_EQ(found->duration, 0);
  EXPECT_EQ(found->videoTracks.size(), 1u);
}

TEST(MoviePropertiesTest, EncryptedTracksAreNotDecodable) {
  using test::big;
  using test::box;
  const std::string protection =
      box("sinf", box("frma", "avc1") + test::fullBox("schm", 0, 0, "cenc" + big(0x10000, 4)));
  const VideoTrack track = trackOf({.format = "encv", .entryBoxes = protection});
  EXPECT_FALSE(track.decodable);
  EXPECT_EQ(track.formatDescriptions.size(), 1u);
}

/// An element of EBML (RFC 8794), its length in eight bytes.
std::string element(std::string_view id, std::string_view content) {
  return std::string(id) + "\x01" + test::big(content.size(), 7) + std::string(content);
}

/// A Matroska file (RFC 9559) with one track of VP8 and `encodings` of it.
std::string matroska(const std::string& encodings) {
  const std::string size = element("\xB0", test::big(64, 2)) + element("\xBA", test::big(48, 2));
  const std::string track = element("\xD7", "\x01") + element("\x73\xC5", "\x01") + element("\x83", "\x01") +
                            element("\x86", "V_VP8") + element("\xE0", size) + encodings;
  const std::string seconds(std::string_view("\x40\x9F\x40\0\0\0\0\0", 8));  // 2,000 ticks
  const std::string info = element("\x2A\xD7\xB1", test::big(1'000'000, 4)) + element("\x44\x89", seconds);
  const std::string cluster = element("\x1F\x43\xB6\x75", element("\xE7", std::string(1, '\0')));
  const std::string tracks = element("\x16\x54\xAE\x6B", element("\xAE", track));
  return element("\x1A\x45\xDF\xA3", element("\x42\x82", "matroska")) +
         element("\x18\x53\x80\x67", element("\x15\x49\xA9\x66", info) + tracks + cluster);
}

TEST(MoviePropertiesTest, EncryptedTracksOfMatroskaAreNotDecodable) {
  const std::string key = element("\x47\xE1", "\x05") + element("\x47\xE2", "the key's name");
  const std::string encoding = element("\x50\x33", "\x01") + element("\x50\x35", key);
  for (const bool encrypted : {false, true}) {
    const auto movie =
        describe(matroska(encrypted ? element("\x6D\x80", element("\x62\x40", encoding)) : ""));
    ASSERT_TRUE(movie && movie->videoTracks.size() == 1);
    EXPECT_EQ(movie->videoTracks[0].decodable, !encrypted);
    EXPECT_EQ(movie->duration, 2);
  }
}

TEST(MoviePropertiesTest, UnknownCodecsAreNotDecodable) {
  EXPECT_FALSE(trackOf({.format = "zzzz"}).decodable);
  EXPECT_TRUE(trackOf({.format = "jpeg"}).decodable);
}

TEST(MoviePropertiesTest, PicturesOfNoSizeAreNoFormat) {
  EXPECT_THAT(trackOf({.width = 0, .height = 0}).formatDescriptions, IsEmpty());
}

TEST(MoviePropertiesTest, WhatIsNoMovieIsNone) {
  EXPECT_FALSE(describe(""));
  EXPECT_FALSE(describe("no movie at all"));
  EXPECT_FALSE(describe(test::madeJpeg(64, 48)));
  EXPECT_FALSE(describe("#EXTM3U\n#EXT-X-TARGETDURATION:1\n#EXTINF:1,\n/etc/passwd\n"));
  EXPECT_FALSE(describe("ffconcat version 1.0\nfile /etc/passwd\n"));
}

TEST(MoviePropertiesTest, AMovieThatIsCutShortIsBoundedWhereverItIs) {
  const std::string file =
      MovieBytes{.tracks = {{.entryBoxes = pixelShapeBox(4, 3), .samples = {test::madeJpeg(64, 48)}}},
                 .metaBox = test::keysBox({{"a.make", "x"}}),
                 .isIndexLast = false}
          .build();
  for (std::size_t length = 0; length < file.size(); ++length) {
    const CountingSource source(file.substr(0, length));
    (void)describeMovie(source);
    ASSERT_LE(source.bytesRead(), length * 2) << length;
  }
}

TEST(MoviePropertiesTest, AMovieWithAnyOtherByteIsBounded) {
  const std::string file =
      MovieBytes{.tracks = {{.entryBoxes = cleanApertureBox(60, 40, 0, 0)}}, .isIndexLast = false}.build();
  for (std::size_t place = 0; place < file.size(); ++place) {
    for (const char other : {'\0', '\1', '\x7F', '\xFF'}) {
      std::string changed = file;
      changed[place] = other;
      const CountingSource source(changed);
      (void)describeMovie(source);
      ASSERT_LE(source.bytesRead(), kMostBesidesIndex) << place;
    }
  }
}

/// Counts what is fetched of a file.
class CountingFile final : public images::ByteSource {
 public:
  explicit CountingFile(const UniqueFd& fd) : source_(fd) {}
  std::uint64_t size() const override { return source_.size(); }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++reads;
    const std::size_t count = source_.read(buffer, offset);
    bytesRead += count;
    return count;
  }
  mutable std::uint64_t reads = 0;
  mutable std::uint64_t bytesRead = 0;

 private:
  DescriptorSource source_;
};

TEST(MoviePropertiesTest, OfAMovieOf100GiBTheIndexAtItsEndIsRead) {
  const test::TemporaryFolder folder;
  const MovieBytes movie{
      .tracks = {{.entryBoxes = cleanApertureBox(60, 40, 0, 0), .samples = {test::madeJpeg(64, 48)}}},
      .metaBox = test::keysBox({{"a.make", "A Maker"}})};
  constexpr std::uint64_t padding = std::uint64_t{100} << 30;
  const std::string beginning = movie.beginning(padding);
  const std::string index = movie.ending();
  test::writeFile(folder / "MVI_0001.MOV", beginning);
  const UniqueFd file(::open((folder / "MVI_0001.MOV").c_str(), O_RDWR | O_CLOEXEC));
  ASSERT_EQ(::pwrite(file.get(), index.data(), index.size(), static_cast<off_t>(beginning.size() + padding)),
            static_cast<ssize_t>(index.size()));
  const CountingFile source(file);
  const auto found = describeMovie(source);
  ASSERT_TRUE(found);
  EXPECT_EQ(found->videoTracks.at(0).formatDescriptions.at(0).cleanAperture->width, 60);
  EXPECT_THAT(found->metadata, ElementsAre(MovieMetadataItem{"make", "A Maker"}));
  EXPECT_LT(source.bytesRead, kMostBesidesIndex + index.size());
  EXPECT_TRUE(firstFrameOf(source, {32, 0}));
  EXPECT_LT(source.bytesRead, 2 * (kMostBesidesIndex + index.size()));
}

std::uint32_t bigAt(const std::string& bytes, std::size_t place) {
  std::uint32_t value = 0;
  for (std::size_t i = 0; i < 4; ++i) value = value << 8 | static_cast<std::uint8_t>(bytes.at(place + i));
  return value;
}

/// Writes the boxes of `movie` to `file`, each media data box `padding` bytes longer than it is.
void writeSpread(const std::string& movie, std::uint32_t padding, const UniqueFd& file) {
  std::uint64_t end = 0;
  for (std::size_t start = 0; start < movie.size();) {
    std::uint32_t length = bigAt(movie, start);
    std::string bytes = movie.substr(start, length);
    start += length;
    if (bytes.substr(4, 4) == "mdat") bytes.replace(0, 4, test::big(length += padding, 4));
    ASSERT_EQ(::pwrite(file.get(), bytes.data(), bytes.size(), static_cast<off_t>(end)),
              static_cast<ssize_t>(bytes.size()));
    end += length;
  }
  ASSERT_EQ(::ftruncate(file.get(), static_cast<off_t>(end)), 0);
}

TEST(MoviePropertiesTest, OfAMovieOfFragmentsLittleMoreThanTheirIndexesIsRead) {
  constexpr int fragments = 1000;
  const std::string movie = test::madeMovie(
      {.container = "mp4",
       .frames = fragments,
       .muxerOptions = {{"movflags", "frag_keyframe+empty_moov+default_base_moof+skip_trailer"}}});
  const test::TemporaryFolder folder;
  const UniqueFd file(::open((folder / "MVI_0001.MP4").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600));
  ASSERT_NO_FATAL_FAILURE(writeSpread(movie, 1 << 20, file));
  const CountingFile source(file);
  const auto found = describeMovie(source);
  ASSERT_TRUE(found);
  EXPECT_NEAR(found->duration.value_or(0), fragments / 25.0, 0.1);
  constexpr std::uint64_t atOnce = 4096;
  EXPECT_LT(source.bytesRead, (fragments + 50) * atOnce);
  EXPECT_LT(source.reads, fragments + 100u);
  EXPECT_TRUE(firstFrameOf(source, {32, 0}));
}

TEST(MoviePropertiesTest, AnOrdinaryMovieTakesFewReads) {
  for (const bool isIndexLast : {false, true}) {
    TrackBytes track;
    track.samples.assign(5000, std::string(100, 's'));
    const CountingSource source(MovieBytes{.tracks = {track}, .isIndexLast = isIndexLast}.build());
    ASSERT_TRUE(describeMovie(source));
    EXPECT_LE(source.reads(), 6u) << isIndexLast;
  }
}

/// Most memory that this process has had, in bytes.
std::uint64_t peakMemory() {
  rusage usage{};
  ::getrusage(RUSAGE_SELF, &usage);
  return static_cast<std::uint64_t>(usage.ru_maxrss) * 1024;
}

TEST(MoviePropertiesTest, AFragmentThatClaimsManySamplesCostsLittleMemory) {
  std::string file = test::madeMovie({.muxerOptions = {{"movflags", "frag_keyframe+empty_moov"}}});
  const std::size_t run = file.find("trun");
  ASSERT_NE(run, std::string::npos);
  // ISO/IEC 14496-12 section 8.8.8: no values for single samples, and their number.
  file.replace(run + 4, 8, test::big(0, 4) + test::big(0x0400'0000, 4));
  const std::uint64_t before = peakMemory();
  (void)describe(file);
  EXPECT_LT(peakMemory() - before, std::uint64_t{512} << 20);
}

class ContainerTest : public testing::TestWithParam<MadeMovie> {};

INSTANTIATE_TEST_SUITE_P(
    MoviePropertiesTest, ContainerTest,
    testing::Values(
        MadeMovie{.container = "mov", .encoder = "libx264"},
        MadeMovie{.container = "mp4", .encoder = "mpeg4"},
        MadeMovie{.container = "ipod", .encoder = "libx264"},
        MadeMovie{.container = "mov", .encoder = "prores_ks", .format = AV_PIX_FMT_YUV422P10},
        MadeMovie{.container = "mov", .encoder = "mjpeg", .format = AV_PIX_FMT_YUVJ420P},
        MadeMovie{.container = "mp4",
                  .encoder = "libx264",
                  .muxerOptions = {{"movflags", "frag_keyframe+empty_moov"}}},
        MadeMovie{.container = "3gp", .encoder = "h263", .width = 176, .height = 144},
        MadeMovie{.container = "avi", .encoder = "mpeg4"},
        MadeMovie{.container = "avi", .encoder = "mjpeg", .format = AV_PIX_FMT_YUVJ420P},
        MadeMovie{.container = "mpegts", .encoder = "mpeg2video"},
        MadeMovie{.container = "mpegts", .encoder = "libx264", .muxerOptions = {{"mpegts_m2ts_mode", "1"}}},
        MadeMovie{.container = "vob", .encoder = "mpeg2video", .frames = 100},
        MadeMovie{.container = "mpeg", .encoder = "mpeg1video", .frames = 100},
        MadeMovie{.container = "matroska", .encoder = "libx264"},
        MadeMovie{.container = "webm", .encoder = "libvpx"},
        MadeMovie{.container = "webm", .encoder = "libvpx-vp9"},
        MadeMovie{.container = "mp4", .encoder = "libaom-av1"},
        MadeMovie{.container = "mxf", .encoder = "mpeg2video"}),
    [](const auto& made) {
      std::string name = std::string(made.param.container) + "_" + made.param.encoder;
      if (!made.param.muxerOptions.empty()) name += "_" + made.param.muxerOptions[0].first;
      std::ranges::replace(name, '-', '_');
      return name;
    });

TEST_P(ContainerTest, SaysItsDurationAndTheSizeOfItsPictures) {
  const MadeMovie& made = GetParam();
  const CountingSource source(test::madeMovie(made));
  const auto movie = describeMovie(source);
  ASSERT_TRUE(movie);
  // Some containers tell times only for whole groups of pictures.
  EXPECT_NEAR(movie->duration.value_or(-1), made.frames / 25.0, made.frames > 10 ? 0.5 : 0.05);
  ASSERT_EQ(movie->videoTracks.size(), 1u);
  const VideoTrack& track = movie->videoTracks.front();
  EXPECT_TRUE(track.decodable);
  EXPECT_EQ(track.preferredTransform, AffineTransform::identity());
  ASSERT_EQ(track.formatDescriptions.size(), 1u);
  EXPECT_EQ(track.formatDescriptions[0].width, made.width);
  EXPECT_EQ(track.formatDescriptions[0].height, made.height);
  EXPECT_LT(source.bytesRead(), kMostBesidesIndex);
}

TEST_P(ContainerTest, ShowsItsFirstFrame) {
  const MadeMovie& made = GetParam();
  const std::string file = test::madeMovie(made);
  const auto picture = firstFrameOf(MemorySource(std::as_bytes(std::span(file))), {});
  ASSERT_TRUE(picture);
  const Frame expected = test::madeFrame(made.width, made.height);
  ASSERT_EQ(picture->frame->width, expected->width);
  ASSERT_EQ(picture->frame->height, expected->height);
  EXPECT_LT(test::meanDifference(*picture->frame, *expected), 5);
}

class OtherShapeTest : public testing::TestWithParam<MadeMovie> {};

INSTANTIATE_TEST_SUITE_P(
    MoviePropertiesTest, OtherShapeTest,
    testing::Values(MadeMovie{.container = "mov", .encoder = "libx264", .pixelShape = {4, 3}},
                    MadeMovie{.container = "matroska", .encoder = "libx264", .pixelShape = {4, 3}},
                    MadeMovie{.container = "avi", .encoder = "mpeg4", .pixelShape = {4, 3}}),
    [](const auto& made) { return std::string(made.param.container); });

TEST_P(OtherShapeTest, TheShapeOfPixelsIsTakenFromWhereverItIsStated) {
  const auto movie = describe(test::madeMovie(GetParam()));
  ASSERT_TRUE(movie && movie->videoTracks.size() == 1);
  const auto dimensions = presentationDimensions(movie->videoTracks[0].formatDescriptions.at(0));
  EXPECT_NEAR(dimensions.width, 64 * 4.0 / 3, 0.5);
  EXPECT_EQ(dimensions.height, 48);
}

}  // namespace
}  // namespace brivo::imaging
