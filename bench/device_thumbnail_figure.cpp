// SPDX-License-Identifier: MIT
#include "device_thumbnail_figure.h"

#include <future>
#include <memory>
#include <vector>

#include "figures.h"
#include "object_reader.h"
#include "photo.h"
#include "thumbnail_client.h"
#include "wire_session.h"

namespace brivo::bench {

namespace {

constexpr unsigned kPixels = 1024;
constexpr double kLeastTimesFaster = 1.8;

/// A device whose catalogue is made.
class Device {
 public:
  Device(const Card& card, std::shared_ptr<const ServiceProcess> service)
      : session_(card, std::move(service)) {
    session_.enumerate();
    session_.device().dropSignals();
  }
  void takeThumbnails(int count) {
    for (int i = 0; i < count; ++i) timeOfThumbnail(session_.device(), kFirstFile, kPixels);
  }

 private:
  WireSession session_;
};

/// Two devices of one service.
class TwoDevices {
 public:
  // Each gives thumbnails in a second.
  double rateOfOne(int count) {
    return count / millisecondsOf([&] { first_.takeThumbnails(count); }) * 1000;
  }
  double rateOfBoth(int count) {
    return 2 * count / millisecondsOf([&] {
             const auto second =
                 std::async(std::launch::async, [this, count] { second_.takeThumbnails(count); });
             first_.takeThumbnails(count);
           }) *
           1000;
  }

 private:
  const std::string photo_ = makePhoto();
  const Card firstCard_{1, photo_};
  const Card secondCard_{1, photo_};
  const std::shared_ptr<const ServiceProcess> service_ =
      std::make_shared<const ServiceProcess>(firstCard_.volumes() + ":" + secondCard_.volumes());
  Device first_{firstCard_, service_};
  Device second_{secondCard_, service_};
};

}  // namespace

void printDeviceThumbnailFigure(const Options& options) {
  TwoDevices devices;
  const int count = options.pick(8, 2);
  devices.rateOfBoth(1);  // starts all workers
  std::vector<double> one, both;
  for (int i = 0; i < options.pick(9, 3); ++i) {
    one.push_back(devices.rateOfOne(count));
    both.push_back(devices.rateOfBoth(count));
  }
  const double ratio = medianRatio(both, one);
  printFigure("thumbnails of 1,024 pixels of one device", inUnits(median(one), "/s"), 1);
  printFigure("thumbnails of 1,024 pixels of two devices at once", inUnits(median(both), "/s"), ratio,
              atLeast(kLeastTimesFaster, ratio));
}

}  // namespace brivo::bench
