// SPDX-License-Identifier: MIT
// The reader against what exiftool says of real camera files. Every difference is listed with its reason in
// disagreements.json and in docs/image-properties.md, and each that is listed is there.
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <fstream>
#include <map>
#include <set>
#include <string>

#include "file_source.h"
#include "oracle.h"
#include "platform/images/image_reader.h"

namespace brivo::images {
namespace {
/// File and fact, and why the two differ.
using Listed = std::map<std::pair<std::string, std::string>, std::string>;

Listed listedDisagreements() {
  Listed listed;
  const nlohmann::json files = readJson(BRIVOD_SOURCE_DIR "/tests/platform/images/disagreements.json");
  for (const auto& [file, facts] : files.items()) {
    for (const auto& [fact, reason] : facts.items()) listed[{file, fact}] = reason;
  }
  return listed;
}

/// Files that are there for their content, not to be damaged or played.
bool isPicture(const CorpusFile& file) {
  const auto isIn = [&](const char* folder) { return file.name.starts_with(folder); };
  return !isIn("malformed/") && !isIn("movie/") && !isIn("audio/") && !kindOf(file).empty();
}

/// JPEG and PNG have their headers in a row, and many short ranges are allowed for them.
bool hasHeadersInARow(const std::filesystem::path& path) {
  std::array<char, 4> start{};
  std::ifstream(path).read(start.data(), start.size());
  const std::string_view bytes(start.data(), start.size());
  return bytes.starts_with("\xFF\xD8") || bytes == "\x89PNG";
}

class OracleOf : public testing::TestWithParam<std::string_view> {};

TEST_P(OracleOf, AgreesUnlessTheReasonIsListed) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  const Listed listed = listedDisagreements();
  std::size_t files = 0;
  for (const CorpusFile& file : corpus->files()) {
    if (!isPicture(file) || kindOf(file) != GetParam()) continue;
    ++files;
    std::set<std::string> seen;
    for (const Disagreement& found : compare(*corpus, file)) {
      seen.insert(found.fact);
      EXPECT_TRUE(listed.contains({file.name, found.fact}))
          << file.name << ": " << found.fact << ": ours is \"" << found.ours << "\", theirs \""
          << found.theirs << '"';
    }
    for (const auto& [place, reason] : listed) {
      EXPECT_TRUE(place.first != file.name || seen.contains(place.second))
          << file.name << ": " << place.second << ": is listed, but the two agree";
    }
  }
  EXPECT_GT(files, 0u);
}

INSTANTIATE_TEST_SUITE_P(Kinds, OracleOf,
                         testing::Values("JPEG", "HEIF", "AVIF", "TIFF", "PNG", "WebP", "CR2", "NEF", "ARW",
                                         "ORF", "RW2", "RAF", "PEF", "CR3", "DNG", "OtherRaw"),
                         [](const auto& kind) { return std::string(kind.param); });

TEST(OracleList, NamesPicturesOfTheCorpus) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  for (const auto& [place, reason] : listedDisagreements()) {
    const auto file = std::ranges::find(corpus->files(), place.first, &CorpusFile::name);
    EXPECT_TRUE(file != corpus->files().end() && isPicture(*file)) << place.first;
    EXPECT_NE(reason, "") << place.first << ": " << place.second;
  }
}

TEST(OracleList, IsTheOneInTheManual) {
  std::ifstream manual(BRIVOD_SOURCE_DIR "/docs/image-properties.md");
  std::set<std::string> written;
  for (std::string line; std::getline(manual, line);) {
    if (line.starts_with("| `")) written.insert(line);
  }
  std::set<std::string> listed;
  for (const auto& [place, reason] : listedDisagreements())
    listed.insert("| `" + place.first + "` | " + place.second + " | " + reason + " |");
  EXPECT_EQ(written, listed);
}

/// The reader is done with any file of the corpus, damaged and hostile ones among them, within its limits.
TEST(OracleBounds, NoFileIsReadBeyondTheLimits) {
  const Corpus* corpus = Corpus::find();
  if (!corpus) GTEST_SKIP() << "no corpus here";
  for (const CorpusFile& file : corpus->files()) {
    const auto path = corpus->pathOf(file);
    const bool isInARow = hasHeadersInARow(path);
    for (const auto read : {copySequentialProperties, copyImageProperties, copyContainerProperties}) {
      const FileSource source(path);
      read(source);
      EXPECT_TRUE(source.stayedInside()) << file.name;
      EXPECT_LE(source.ranges(), isInARow ? 65u : 5u) << file.name;
      EXPECT_LE(source.bytesAsked(), (isInARow ? 528u : 256u) * 1024) << file.name;
    }
  }
}

}  // namespace
}  // namespace brivo::images
