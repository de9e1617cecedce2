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
constexpr unsigned kLarge = 1024;
constexpr double kMostToThumbnailerOfItem = 0.7;
constexpr double kMostToThumbnailerOfPicture = 0.65;

/// A file of heif-enc with a thumbnail item.
std::string makeHeic(const Options& options) {
  const test::TemporaryFolder folder;
  const std::string photo = folder / "photo.jpg", heic = folder / "photo.heic";
  test::writeFile(photo, makePhoto(4000, 3000));
  const std::string preset = options.pick("fast", "ultrafast");
  runOrThrow({"heif-enc", "-q", "50", "-t", std::to_string(kThumbnailItem), "-p", "preset=" + preset, "-o",
              heic, photo});
  return test::readFile(heic);
}

/// It behind the service.
class HeicPicture {
 public:
  explicit HeicPicture(const Options& options) : card_(1, makeHeic(options), "HEIC"), session_(card_) {
    session_.enumerate();
    session_.device().dropSignals();
    for (const unsigned pixels : {kThumbnailItem, kLarge})
      checkThumbnail(session_.device(), kFirstFile, pixels);
  }

  double timeOfService(unsigned pixels) { return timeOfThumbnail(session_.device(), kFirstFile, pixels); }
  /// Of the thumbnail item, when there is one.
  double timeOfThumbnailer(unsigned pixels) const {
    return timeOf({"heif-thumbnailer", "-s", std::to_string(pixels)});
  }
  /// Of the picture itself.
  double timeOfThumbnailerOfPicture(unsigned pixels) const {
    return timeOf({"heif-thumbnailer", "-p", "-s", std::to_string(pixels)});
  }

 private:
  double timeOf(std::vector<std::string> words) const {
    const test::TemporaryFolder folder;
    words.insert(words.end(), {card_.firstFile(), folder / "made.png"});
    return runOrThrow(words).milliseconds;
  }

  const Card card_;
  WireSession session_;
};

void compare(HeicPicture& picture, unsigned pixels, const std::optional<Rival>& rival,
             const Options& options) {
  printComparison(
      "thumbnail of " + grouped(pixels) + " pixels of a HEIC of 12 megapixels",
      [&] { return picture.timeOfService(pixels); }, rival ? std::vector{*rival} : std::vector<Rival>(),
      options.pick(9, 3));
}

}  // namespace

void printHeicFigures(const Options& options) {
  if (!isInstalled("heif-enc")) return printNote("no HEIC picture: heif-enc is not installed");
  HeicPicture picture(options);
  std::optional<Rival> ofItem, ofPicture;
  if (canCompareWith("heif-thumbnailer")) {
    ofItem = Rival{"heif-thumbnailer", [&] { return picture.timeOfThumbnailer(kThumbnailItem); },
                   kMostToThumbnailerOfItem};
    ofPicture = Rival{"heif-thumbnailer -p", [&] { return picture.timeOfThumbnailerOfPicture(kLarge); },
                      kMostToThumbnailerOfPicture};
  }
  compare(picture, kThumbnailItem, ofItem, options);
  compare(picture, kLarge, ofPicture, options);
}

}  // namespace brivo::bench
