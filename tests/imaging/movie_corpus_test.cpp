// SPDX-License-Identifier: MIT
// Movies of real cameras, against what ffprobe says of them.
#include <fcntl.h>
#include <gtest/gtest.h>

#include <cmath>
#include <set>

#include "corpus.h"
#include "imaging/local_movie_reader.h"

namespace brivo {
namespace {

using images::Corpus;
using images::CorpusFile;
using nlohmann::json;

std::vector<CorpusFile> moviesOf(const Corpus& corpus) {
  std::vector<CorpusFile> movies;
  for (const CorpusFile& file : corpus.files()) {
    const std::string type = file.facts.value("mime_type", "");
    if (type.starts_with("video/") || type == "audio/mp4") movies.push_back(file);
  }
  return movies;
}

std::vector<json> videoStreams(const json& probe) {
  std::vector<json> streams;
  for (const json& stream : probe["streams"]) {
    if (stream.value("codec_type", "") == "video") streams.push_back(stream);
  }
  return streams;
}

/// Degrees clockwise.
double turnOf(const VideoTrack& track) {
  return std::atan2(track.preferredTransform.b, track.preferredTransform.a) * 180 / M_PI;
}

double shapeIn(const json& stream) {
  const std::string text = stream.value("sample_aspect_ratio", "1:1");
  const double width = std::stod(text);
  const double height = std::stod(text.substr(text.find(':') + 1));
  return width > 0 && height > 0 ? width / height : 1;
}

void compare(const VideoTrack& track, const json& stream) {
  ASSERT_EQ(track.formatDescriptions.size(), 1u);
  const auto shown = presentationDimensions(track.formatDescriptions.front());
  // The shape that only the pictures of H.263 state is not the container's.
  const double shape = stream.value("codec_name", "") == "h263" ? 1 : shapeIn(stream);
  EXPECT_NEAR(shown.width, stream["width"].get<double>() * shape, 0.01);
  EXPECT_EQ(shown.height, stream["height"].get<double>());
  const double turn = stream.value("display_matrix_rotation_ccw", 0.0);
  const double difference = turnOf(track) + (std::abs(turn) > 360 ? 0 : turn);  // none for a matrix of zeros
  EXPECT_NEAR(std::remainder(difference, 360), 0, 0.01);
  EXPECT_TRUE(track.decodable);
}

class MovieCorpusTest : public testing::Test {
 protected:
  void SetUp() override {
    if (!corpus) GTEST_SKIP() << "there is no corpus here";
  }
  UniqueFd open(const CorpusFile& file) const {
    return UniqueFd(::open(corpus->pathOf(file).c_str(), O_RDONLY | O_CLOEXEC));
  }

  const Corpus* corpus = Corpus::find();
  LocalMovieReader reader;
};

TEST_F(MovieCorpusTest, DurationSizeAndRotationAreWhatFfprobeSays) {
  std::size_t compared = 0;
  for (const CorpusFile& file : moviesOf(*corpus)) {
    SCOPED_TRACE(file.name);
    const auto movie = reader.describe(open(file));
    const json probe = file.facts.value("ffprobe", json());
    if (probe.is_null()) {
      EXPECT_TRUE(!movie || movie->videoTracks.empty());
      continue;
    }
    ASSERT_TRUE(movie);
    EXPECT_EQ(movie->duration.has_value(), probe.contains("duration"));
    EXPECT_NEAR(movie->duration.value_or(0), probe.value("duration", 0.0), 1e-5);
    const auto streams = videoStreams(probe);
    ASSERT_EQ(movie->videoTracks.size(), streams.size());
    for (std::size_t i = 0; i < streams.size(); ++i) compare(movie->videoTracks[i], streams[i]);
    ++compared;
  }
  EXPECT_GE(compared, 40u);
}

/// Only the first kilobyte of them is there.
const std::set<std::string> kWithoutPictures{"movie/et-M2TS.mts", "movie/et-Pentax.avi"};

TEST_F(MovieCorpusTest, EveryMovieWithPicturesShowsOne) {
  for (const CorpusFile& file : moviesOf(*corpus)) {
    SCOPED_TRACE(file.name);
    const json probe = file.facts.value("ffprobe", json());
    const bool hasPictures =
        !probe.is_null() && !videoStreams(probe).empty() && !kWithoutPictures.contains(file.name);
    EXPECT_EQ(reader.firstFrame(open(file), {160, 0}).has_value(), hasPictures);
  }
}

/// Empty when the movie does not say it.
std::string valueIn(const MovieDescription& movie, const std::string& key) {
  for (const auto& [name, value] : movie.metadata) {
    if (name == key) return value;
  }
  return {};
}

TEST_F(MovieCorpusTest, MakeAndModelAreWhatOthersFind) {
  std::size_t compared = 0;
  for (const CorpusFile& file : moviesOf(*corpus)) {
    // In AVCHD the pictures say it, the make as a number, and not the container, which is what we read.
    if (!file.facts.contains("movie") || file.facts.value("mime_type", "") == "video/m2ts") continue;
    SCOPED_TRACE(file.name);
    const auto movie = reader.describe(open(file));
    for (const char* key : {"make", "model"}) {
      const std::string expected = file.facts.value(key, "");
      EXPECT_EQ(movie ? valueIn(*movie, key) : "", expected) << key;
      compared += expected.empty() ? 0 : 1;
    }
  }
  EXPECT_GE(compared, 2u);
}

TEST_F(MovieCorpusTest, AMovieOfATestCameraSaysItsMakeAndModel) {
  const CorpusFile file{"movie/mk-d-rot90-makemodel.mov", {}};
  const auto movie = reader.describe(open(file));
  ASSERT_TRUE(movie);
  const std::vector<MovieMetadataItem> expected{{"make", "TestMake dev"}, {"model", "TestModel dev"}};
  EXPECT_EQ(movie->metadata, expected);
}

}  // namespace
}  // namespace brivo
