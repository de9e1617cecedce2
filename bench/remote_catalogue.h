// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "card.h"
#include "catalogue_recorder.h"
#include "orvidcore/device_browser.h"
#include "service_process.h"

namespace brivo::bench {

/// One card behind a service process that has just been started, opened by this process through the client
/// library. Its catalogue can be asked for once.
class RemoteCatalogue {
 public:
  /// `card` must outlive this. Throws when the device cannot be opened.
  explicit RemoteCatalogue(const Card& card);
  ~RemoteCatalogue();

  const ServiceProcess& service() const { return service_; }
  /// From the enumerate call to the last object, as the client's callbacks see it.
  CatalogueTimes enumerate();

 private:
  const Card& card_;
  const ServiceProcess service_;
  std::shared_ptr<orvid::DeviceBrowser> browser_;
  std::shared_ptr<orvid::Device> device_;
};

}  // namespace brivo::bench
