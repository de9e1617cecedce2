// SPDX-License-Identifier: MIT
#include "embedded_thumbnail_figures.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <span>
#include <stdexcept>
#include <vector>

#include "camera_picture.h"
#include "comparison.h"
#include "echo_process.h"
#include "figures.h"
#include "object_reader.h"
#include "photo.h"
#include "thumbnail_client.h"
#include "wire_session.h"
#ifdef BENCH_LIBGPHOTO2
#include "libgphoto2_camera.h"
#endif

namespace brivo::bench {

namespace {

constexpr double kMostToLibgphoto2 = 0.25;
constexpr double kMostToBareLoop = 2;
constexpr unsigned kPixels = 160;
constexpr std::size_t kPictures = 500;

/// Pictures with thumbnails behind the service, and others that read them.
class PicturesWithThumbnails {
 public:
  PicturesWithThumbnails()
      : thumbnail_(makePhoto(kPixels, 120)),
        picture_(withCameraExif(makePhoto(640, 480), thumbnail_)),
        card_(kPictures, picture_),
        session_(card_) {
    session_.enumerate();
    session_.device().dropSignals();
    answer_ = checkedAnswer();
    for (std::size_t i = 0; i < kPictures; ++i) {
      requests_.push_back(thumbnailRequest(kFirstFile + i, kPixels));
    }
  }

  double timeOfService() {
    return timeOfEach([&](std::size_t i) { session_.device().roundTrips(requests_[i], 1, 1); });
  }

  /// Reads the same bytes and sends them to and fro with a process that was just started.
  double timeOfBareLoop() const {
    EchoProcess echo(requests_.front().size(), answer_);
    WireClient client(echo.takeSocket());
    std::string buffer(thumbnail_.size(), '\0');
    const auto work = [&](std::size_t i) {
      readThumbnail(card_.filePath(i), buffer);
      client.roundTrips(requests_[i], 1, 1);
    };
    timeOfEach(work);
    return timeOfEach(work);
  }

#ifdef BENCH_LIBGPHOTO2
  /// With a camera that has not read them before.
  double timeOfLibgphoto2() const {
    const Libgphoto2Camera camera(card_.path(), Card::firstFolder());
    return timeOfEach([&](std::size_t i) {
      if (camera.thumbnail(card_.fileName(i)).size() != thumbnail_.size()) {
        throw std::runtime_error("libgphoto2 finds another thumbnail");
      }
    });
  }
#endif

 private:
  /// Milliseconds for one.
  template <class Work>
  static double timeOfEach(Work work) {
    const Stopwatch watch;
    for (std::size_t i = 0; i < kPictures; ++i) work(i);
    return watch.milliseconds() / kPictures;
  }

  std::string checkedAnswer() {
    const ReceivedThumbnail received(session_.device(), kFirstFile, kPixels);
    if (!std::ranges::equal(received.bytes(), std::as_bytes(std::span(thumbnail_)))) {
      throw std::runtime_error("the thumbnail is not the one in the file");
    }
    return received.answer();
  }

  void readThumbnail(const std::string& path, std::string& buffer) const {
    const UniqueFd file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    const ssize_t count = ::pread(file.get(), buffer.data(), buffer.size(), offset_);
    if (count != static_cast<ssize_t>(buffer.size())) throw std::runtime_error("cannot read " + path);
  }

  const std::string thumbnail_;
  const std::string picture_;
  const off_t offset_ = static_cast<off_t>(picture_.find(thumbnail_));
  const Card card_;
  WireSession session_;
  std::vector<std::string> requests_;
  std::string answer_;
};

std::vector<Rival> rivalsOf(const PicturesWithThumbnails& pictures) {
  std::vector<Rival> rivals{{"a bare loop that reads and sends the same bytes",
                             [&] { return pictures.timeOfBareLoop(); }, kMostToBareLoop}};
#ifdef BENCH_LIBGPHOTO2
  rivals.push_back(
      {"libgphoto2 in this process", [&] { return pictures.timeOfLibgphoto2(); }, kMostToLibgphoto2});
#else
  printNote("no comparison with libgphoto2, without which this was built");
#endif
  return rivals;
}

}  // namespace

void printEmbeddedThumbnailFigures(const Options& options) {
  PicturesWithThumbnails pictures;
  printComparison(
      "thumbnail of 160 pixels in a JPEG", [&] { return pictures.timeOfService(); }, rivalsOf(pictures),
      options.pick(31, 5));
}

}  // namespace brivo::bench
