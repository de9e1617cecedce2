// SPDX-License-Identifier: MIT
#include "remote_catalogue.h"

#include <algorithm>
#include <stdexcept>

#include "support/wait.h"

namespace brivo::bench {

namespace {

template <class T>
T valueOf(orvid::Result<T> result) {
  if (!result.ok()) throw std::runtime_error(result.error().text);
  return *std::move(result);
}

orvid::DeviceInfo waitForDevice(const orvid::DeviceBrowser& browser, const std::string& path) {
  std::vector<orvid::DeviceInfo> devices;
  const auto isThere = [&] {
    devices = valueOf(browser.devices());
    return !devices.empty();
  };
  if (!test::waitUntil(isThere)) throw std::runtime_error("no device for " + path);
  return devices.front();
}

}  // namespace

RemoteCatalogue::RemoteCatalogue(const Card& card)
    : card_(card), recorder_(std::make_shared<CatalogueRecorder>(card.objects())), service_(card.volumes()) {
  browser_ = valueOf(orvid::DeviceBrowser::connect(service_.address()));
  device_ = valueOf(browser_->open(waitForDevice(*browser_, card.path())));
  valueOf(device_->start());
}

RemoteCatalogue::~RemoteCatalogue() = default;

CatalogueTimes RemoteCatalogue::enumerate() {
  orvid::DeviceEvents events;
  events.onReady = [recorder = recorder_](std::int32_t) { recorder->ready(); };
  events.onItems = [recorder = recorder_](const std::vector<orvid::ObjectInfo>& items) {
    if (!std::ranges::all_of(items, &orvid::ObjectInfo::isFolder)) recorder->fileArrived();
    recorder->sizesArrived(static_cast<std::size_t>(
        std::ranges::count_if(items, [](const orvid::ObjectInfo& item) { return item.width != 0; })));
    recorder->arrived(items.size());
  };
  device_->setEvents(std::move(events));
  recorder_->begin();
  device_->enumerateAsync({}, [](const orvid::Result<orvid::Done>&) {});
  return recorder_->wait();
}

}  // namespace brivo::bench
