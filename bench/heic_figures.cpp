// SPDX-License-Identifier: MIT
#include "heic_figures.h"

#include <optional>
#include <vector>

#include "command.h"
#include "comparison.h"
#include "figures.h"
#include "object_reader.h"
#include "photo.h"
#include "support/temporary_folder.h"
#include "thumbnail_client.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr unsigned kThumbnailItem = 320;
constexpr double kMostToHeifThumbnailer = 0.7;
constexpr unsigned kLarge = 1024;
constexpr double kMostToHeifThumbnailerOfPicture = 0.65;

/// A file of heif-enc with a thumbnail item; none, with a note, where that is not installed.
std::optional<std::string> makeHeic(const Options& options) {
  if (!isInstalled("heif-enc")) {
    printNote("no HEIC picture: heif-enc is not installed");
    return std::nullopt;
  }
  const test::TemporaryFolder folder;
  const std::string photo = folder / "photo.jpg", heic = folder / "photo.heic";
  test::writeFile(photo, makePhoto(4000, 3000));
  const std::string preset = options.pick("fast", "ultrafast");
  runOrThrow({"heif-enc", "-q", "50", "-t", std::to_string(kThumbnailItem), "-p", "preset=" + preset, "-o",
              heic, photo});
  return test::readFile(heic);
}

double timeOfHeifThumbnailer(std::vector<std::string> options, const std::string& picture) {
  const test::TemporaryFolder folder;
  std::vector<std::string> words{"heif-thumbnailer"};
  words.insert(words.end(), options.begin(), options.end());
  words.insert(words.end(), {picture, folder / "made.png"});
  return runOrThrow(words).milliseconds;
}

}  // namespace

void printHeicFigures(const Options& options) {
  const auto picture = makeHeic(options);
  if (!picture) return;
  const Card card(1, *picture, "HEIC");
  WireSession session(card);
  session.enumerate();
  session.device().dropSignals();
  const bool hasPeer = canCompareWith("heif-thumbnailer");
  const auto compare = [&](unsigned pixels, const std::string& what, std::vector<std::string> peerOptions,
                           double most) {
    checkThumbnail(session.device(), kFirstFile, pixels);
    std::vector<Rival> rivals;
    if (hasPeer)
      rivals.push_back({"heif-thumbnailer" + what,
                        [&, peerOptions] { return timeOfHeifThumbnailer(peerOptions, card.firstFile()); },
                        most});
    printComparison(
        "thumbnail of " + grouped(pixels) + " pixels of a HEIC of 12 megapixels",
        [&] { return timeOfThumbnail(session.device(), kFirstFile, pixels); }, rivals, options.pick(9, 3));
  };
  compare(kThumbnailItem, "", {"-s", std::to_string(kThumbnailItem)}, kMostToHeifThumbnailer);
  compare(kLarge, " -p", {"-p", "-s", std::to_string(kLarge)}, kMostToHeifThumbnailerOfPicture);
}

}  // namespace brivo::bench
