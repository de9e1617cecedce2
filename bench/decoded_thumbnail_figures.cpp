// SPDX-License-Identifier: MIT
#include "decoded_thumbnail_figures.h"

#include <array>
#include <stdexcept>
#include <vector>

#include "command.h"
#include "comparison.h"
#include "figures.h"
#include "libjpeg_loop.h"
#include "object_reader.h"
#include "photo.h"
#include "support/temporary_folder.h"
#include "support/wait.h"
#include "thumbnail_client.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr double kMostToLibjpeg = 1.1;
constexpr double kMostToFfmpegthumbnailer = 0.2;
constexpr double kMostMemoryToVipsthumbnail = 0.25;
/// Pictures that share one start of vipsthumbnail.
constexpr std::size_t kPictures = 4;

struct Size {
  unsigned pixels;
  double mostToVipsthumbnail;
};
constexpr std::array<Size, 3> kSizes{{{160, 0.9}, {256, 0.9}, {1024, 0.75}}};
constexpr unsigned kLargest = 1024;

/// The service with pictures whose catalogue is made.
class Service {
 public:
  explicit Service(const Card& card) : session_(card) {
    session_.enumerate();
    session_.device().dropSignals();
  }

  WireClient& client() { return session_.device(); }
  void takeAll(unsigned pixels) {
    for (std::size_t i = 0; i < kPictures; ++i) timeOfThumbnail(client(), kFirstFile + i, pixels);
  }
  /// The service and its workers, of which there must be one.
  std::vector<ProcessInfo> processes() const {
    const ProcessInfo service = session_.service().process();
    if (!test::waitUntil([&] { return !service.children().empty(); })) {
      throw std::runtime_error("the service has started no worker");
    }
    std::vector<ProcessInfo> processes = service.children();
    processes.push_back(service);
    return processes;
  }

 private:
  WireSession session_;
};

Outcome runVipsthumbnail(const Card& card, unsigned pixels, std::size_t pictures) {
  const test::TemporaryFolder folder;
  std::vector<std::string> words{"vipsthumbnail", "--size", std::to_string(pixels), "-o",
                                 folder / "%s.jpg[Q=85]"};
  for (std::size_t i = 0; i < pictures; ++i) words.push_back(card.filePath(i));
  return runOrThrow(words);
}

void runFfmpegthumbnailer(const Card& card, unsigned pixels) {
  const test::TemporaryFolder folder;
  for (std::size_t i = 0; i < kPictures; ++i) {
    runOrThrow({"ffmpegthumbnailer", "-i", card.filePath(i), "-o", folder / "made.jpg", "-c", "jpeg", "-s",
                std::to_string(pixels)});
  }
}

/// The programs to compare with that are there.
struct Programs {
  const bool vipsthumbnail = canCompareWith("vipsthumbnail");
  const bool ffmpegthumbnailer = canCompareWith("ffmpegthumbnailer");
};

/// Milliseconds for one picture.
template <class Work>
double timePerPicture(Work work) {
  return millisecondsOf(work) / kPictures;
}

std::vector<Rival> rivalsFor(const Size& size, const Card& card, const Programs& programs) {
  const unsigned pixels = size.pixels;
  const auto libjpeg = [&card, pixels] {
    for (std::size_t i = 0; i < kPictures; ++i) scaleWithLibjpeg(card.filePath(i), pixels);
  };
  const auto vips = [&card, pixels] { runVipsthumbnail(card, pixels, kPictures); };
  const auto ffmpeg = [&card, pixels] { runFfmpegthumbnailer(card, pixels); };
  std::vector<Rival> rivals{
      {"libjpeg-turbo in this process", [=] { return timePerPicture(libjpeg); }, kMostToLibjpeg}};
  if (programs.vipsthumbnail) {
    rivals.push_back({"vipsthumbnail", [=] { return timePerPicture(vips); }, size.mostToVipsthumbnail});
  }
  if (programs.ffmpegthumbnailer) {
    rivals.push_back({"ffmpegthumbnailer", [=] { return timePerPicture(ffmpeg); }, kMostToFfmpegthumbnailer});
  }
  return rivals;
}

void compareTimes(const Card& card, const Programs& programs, const Options& options) {
  Service service(card);
  for (const Size& size : kSizes) {
    checkThumbnail(service.client(), kFirstFile, size.pixels);
    printComparison(
        "thumbnail of " + grouped(size.pixels) + " pixels of a JPEG of 24 megapixels",
        [&] { return timePerPicture([&] { service.takeAll(size.pixels); }); },
        rivalsFor(size, card, programs), options.pick(9, 1));
  }
}

/// Of a service that was just started, as the kernel may not reset the peak of a worker.
void compareMemory(const Card& card, const Programs& programs) {
  Service service(card);
  const double megabytes = peakAboveRest(service.processes(), [&] { service.takeAll(kLargest); });
  printFigure("memory above rest, service and worker, 1,024 pixels", inUnits(megabytes, "MiB"));
  if (!programs.vipsthumbnail) return;
  const double theirs = runVipsthumbnail(card, kLargest, 1).peakKilobytes / 1024;
  const double ratio = megabytes / theirs;
  printFigure("  to the peak of vipsthumbnail", inUnits(theirs, "MiB"), ratio,
              atMost(kMostMemoryToVipsthumbnail, ratio));
}

}  // namespace

void printDecodedThumbnailFigures(const Options& options) {
  const Card card(kPictures, makePhoto());
  const Programs programs;
  compareTimes(card, programs, options);
  compareMemory(card, programs);
}

}  // namespace brivo::bench
