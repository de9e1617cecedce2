// SPDX-License-Identifier: MIT
#include "movie_figures.h"

#include <stdexcept>
#include <vector>

#include "clip.h"
#include "command.h"
#include "comparison.h"
#include "figures.h"
#include "remote_catalogue.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

namespace {

constexpr double kMostToFfprobe = 0.1;
/// Movies that ffprobe looks at in a turn.
constexpr std::size_t kProbed = 10;

// Each gives milliseconds for one movie.

double timeOfCatalogue(const Card& card) {
  RemoteCatalogue catalogue(card);
  const double time = catalogue.enumerate().last;
  if (catalogue.filesWithSize() != card.files()) throw std::runtime_error("a movie came without its size");
  return time / static_cast<double>(card.files());
}

/// One process for each.
double timeOfFfprobe(const Card& card) {
  double time = 0;
  for (std::size_t i = 0; i < kProbed; ++i)
    time += runOrThrow({"ffprobe", "-v", "error", "-show_format", "-show_streams", card.filePath(i)})
                .milliseconds;
  return time / kProbed;
}

void printMoviesIn(const std::string& extension, const Options& options) {
  const test::TemporaryFolder folder;
  const std::string clip = folder / "clip." + extension;
  makeClip(clip, options.pick(60, 4));
  const Card card(options.pick<std::size_t>(200, 20), asLinkTo(clip), extension);
  std::vector<Rival> rivals;
  if (canCompareWith("ffprobe"))
    rivals.push_back({"ffprobe", [&] { return timeOfFfprobe(card); }, kMostToFfprobe});
  printComparison(
      "catalogue of " + grouped(card.files()) + " movies (" + extension + "), each",
      [&] { return timeOfCatalogue(card); }, rivals, options.pick(9, 3));
}

}  // namespace

void printMovieFigures(const Options& options) {
  if (!canMakeClips()) return;
  for (const char* extension : {"MOV", "MP4"}) printMoviesIn(extension, options);
}

}  // namespace brivo::bench
