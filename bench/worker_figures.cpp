// SPDX-License-Identifier: MIT
#include "worker_figures.h"

#include <stdexcept>
#include <vector>

#include "comparison.h"
#include "figures.h"
#include "imaging/local_image_decoder.h"
#include "object_reader.h"
#include "photo.h"
#include "platform/decoding/imaging_service.h"
#include "service_process.h"
#include "support/open_file.h"

namespace brivo::bench {

namespace {

constexpr unsigned kPixels = 1024;
constexpr double kMostToDecoder = 1.03;
constexpr unsigned kTiny = 16;

WorkerOptions builtWorker() {
  WorkerOptions options;
  options.program = builtProgram("brivod-imaging");
  return options;
}

void takeThumbnail(ImageDecoder& decoder, const UniqueFd& file, unsigned pixels) {
  const auto thumbnail = decoder.thumbnail(file, {.maximumPixelSize = pixels});
  if (!thumbnail) throw std::runtime_error("no thumbnail of a picture");
  touch(thumbnail->bytes());
}

void compareDecoders(const UniqueFd& photo, const Options& options) {
  WorkerPool workers(builtWorker());
  ImagingService service(workers);
  LocalImageDecoder local;
  const auto timeOf = [&](ImageDecoder& decoder) {
    return millisecondsOf([&] { takeThumbnail(decoder, photo, kPixels); });
  };
  printComparison(
      "thumbnail of 1,024 pixels by a worker", [&] { return timeOf(service); },
      {{"the same decoder in this process", [&] { return timeOf(local); }, kMostToDecoder}},
      options.pick(31, 5));
}

void printTimeOfStart(const UniqueFd& tiny, const Options& options) {
  std::vector<double> times;
  for (int i = 0; i < options.pick(31, 5); ++i) {
    times.push_back(millisecondsOf([&] {
      WorkerPool workers(builtWorker());
      ImagingService service(workers);
      takeThumbnail(service, tiny, kTiny);
    }));
  }
  printFigure("start of a worker up to its first thumbnail", inMilliseconds(median(times)));
}

}  // namespace

void printWorkerFigures(const Options& options) {
  compareDecoders(test::fileWith(makePhoto()), options);
  printTimeOfStart(test::fileWith(makePhoto(kTiny, kTiny)), options);
}

}  // namespace brivo::bench
