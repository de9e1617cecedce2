// SPDX-License-Identifier: MIT
#include "movie_frame_figures.h"

#include <memory>
#include <vector>

#include "clip.h"
#include "command.h"
#include "comparison.h"
#include "figures.h"
#include "libav_loop.h"
#include "object_reader.h"
#include "support/temporary_folder.h"
#include "thumbnail_client.h"
#include "tumbler.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr unsigned kPixels = 160;
constexpr double kMostToLibav = 1.25;
constexpr double kMostToFfmpegthumbnailer = 0.33;
constexpr double kMostToTumbler = 0.5;

FileMaker asClip(unsigned seconds) {
  return [seconds](const std::string& path) { makeClip(path, seconds); };
}

double timeOfFfmpegthumbnailer(const std::string& movie) {
  const test::TemporaryFolder folder;
  return runOrThrow({"ffmpegthumbnailer", "-i", movie, "-o", folder / "made.jpg", "-c", "jpeg", "-s",
                     std::to_string(kPixels)})
      .milliseconds;
}

/// `tumbler` is null when it is not there.
std::vector<Rival> rivalsFor(const std::string& movie, Tumbler* tumbler) {
  std::vector<Rival> rivals{{"libavformat, libavcodec and libswscale in this process",
                             [=] { return millisecondsOf([&] { firstFrameWithLibav(movie, kPixels); }); },
                             kMostToLibav}};
  if (canCompareWith("ffmpegthumbnailer"))
    rivals.push_back(
        {"ffmpegthumbnailer", [=] { return timeOfFfmpegthumbnailer(movie); }, kMostToFfmpegthumbnailer});
  if (tumbler)
    rivals.push_back({"tumbler, 128 pixels",
                      [=] { return tumbler->timeOfThumbnail(movie, "video/quicktime"); }, kMostToTumbler});
  return rivals;
}

}  // namespace

void printMovieFrameFigures(const Options& options) {
  if (!canMakeClips()) return;
  const Card card(1, asClip(options.pick(60, 4)), "MOV");
  WireSession session(card);
  session.enumerate();
  session.device().dropSignals();
  checkThumbnail(session.device(), kFirstFile, kPixels);
  const std::unique_ptr<Tumbler> tumbler = Tumbler::startForMovies();
  printComparison(
      "first frame of a movie of 1080p, 160 pixels",
      [&] { return timeOfThumbnail(session.device(), kFirstFile, kPixels); },
      rivalsFor(card.firstFile(), tumbler.get()), options.pick(31, 5));
}

}  // namespace brivo::bench
