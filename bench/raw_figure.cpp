// SPDX-License-Identifier: MIT
#include "raw_figure.h"

#include <stdexcept>
#include <vector>

#include "command.h"
#include "figures.h"
#include "platform/images/file_source.h"
#include "platform/images/image_reader.h"
#include "raw_file.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

namespace {

constexpr double kMostToDcraw = 0.1;
constexpr int kReads = 200;
/// Files that share one start of dcraw.
constexpr int kFilesOfDcraw = 4;

/// Opens the file and reads its facts; gives how many bytes that took.
std::uint64_t readFacts(const std::string& path) {
  const images::FileSource source(path);
  const auto properties = images::copyContainerProperties(source);
  const std::size_t jpegs = properties ? properties->embedded.size() + (properties->thumbnail ? 1 : 0) : 0;
  if (jpegs < kJpegsOfRawFile) throw std::runtime_error("the image reader does not find all of a raw file");
  return source.bytesAsked();
}

double timeOfReader(const std::string& path) {
  return millisecondsOf([&] {
           for (int i = 0; i < kReads; ++i) readFacts(path);
         }) /
         kReads;
}

double timeOfDcraw(const std::string& path) {
  std::vector<std::string> words{"dcraw", "-i"};
  words.insert(words.end(), kFilesOfDcraw, path);
  return runOrThrow(words).milliseconds / kFilesOfDcraw;
}

}  // namespace

void printRawFigure(const Options& options) {
  const test::TemporaryFolder folder;
  const std::string path = folder / "DSC_0001.NEF";
  makeRawFile(path);
  const bool hasDcraw = run({"dcraw", "-i", path}).exitCode == 0;
  std::vector<double> ours, theirs;
  for (int i = 0; i < options.pick(15, 3); ++i) {
    if (hasDcraw) theirs.push_back(timeOfDcraw(path));
    ours.push_back(timeOfReader(path));
  }
  printFigure("bytes read of a raw file of 50 MB", grouped(readFacts(path)) + " B");
  if (!hasDcraw) {
    printNote("no comparison with dcraw, which is not installed");
    printFigure("facts of a raw file of 50 MB", inMilliseconds(median(ours)));
    return;
  }
  const double ratio = medianRatio(ours, theirs);
  printFigure("dcraw -i, a raw file of 50 MB", inMilliseconds(median(theirs)), 1);
  printFigure("facts of a raw file of 50 MB", inMilliseconds(median(ours)), ratio,
              atMost(kMostToDcraw, ratio));
}

}  // namespace brivo::bench
