// SPDX-License-Identifier: MIT
#include "raw_preview_figures.h"

#include <array>
#include <vector>

#include "command.h"
#include "comparison.h"
#include "figures.h"
#include "object_reader.h"
#include "raw_file.h"
#include "support/temporary_folder.h"
#include "thumbnail_client.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr double kMostToExiv2 = 0.1;
/// Files that share one start of exiv2.
constexpr std::size_t kFiles = 4;

struct Preview {
  unsigned pixels;
  const char* exiv2Option;  ///< previews are numbered from the smallest on
};
constexpr std::array<Preview, 2> kPreviews{{{160, "-ep1"}, {1620, "-ep3"}}};

/// Raw files of 50 MB behind the service.
class RawFiles {
 public:
  RawFiles() : card_(kFiles, makeRawFile, "NEF"), session_(card_) {
    session_.enumerate();
    session_.device().dropSignals();
    for (const Preview& preview : kPreviews) checkThumbnail(session_.device(), kFirstFile, preview.pixels);
  }

  // Each gives milliseconds for one file.
  double timeOfService(const Preview& preview) {
    double milliseconds = 0;
    for (std::size_t i = 0; i < kFiles; ++i)
      milliseconds += timeOfThumbnail(session_.device(), kFirstFile + i, preview.pixels);
    return milliseconds / kFiles;
  }
  double timeOfExiv2(const Preview& preview) const {
    const test::TemporaryFolder folder;
    std::vector<std::string> words{"exiv2", "-q", "-f", preview.exiv2Option, "-l", folder.path(), "ex"};
    for (std::size_t i = 0; i < kFiles; ++i) words.push_back(card_.filePath(i));
    return runOrThrow(words).milliseconds / kFiles;
  }

 private:
  const Card card_;
  WireSession session_;
};

}  // namespace

void printRawPreviewFigures(const Options& options) {
  RawFiles files;
  const bool hasExiv2 = canCompareWith("exiv2");
  for (const Preview& preview : kPreviews) {
    std::vector<Rival> rivals;
    if (hasExiv2)
      rivals.push_back({"exiv2 " + std::string(preview.exiv2Option),
                        [&] { return files.timeOfExiv2(preview); }, kMostToExiv2});
    printComparison(
        "preview of " + grouped(preview.pixels) + " pixels in a raw file of 50 MB",
        [&] { return files.timeOfService(preview); }, rivals, options.pick(31, 5));
  }
}

}  // namespace brivo::bench
