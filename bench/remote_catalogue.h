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
  /// Files of the catalogue that came with the size of the picture in them.
  std::size_t filesWithSize() const { return recorder_->filesWithSize(); }

 private:
  const Card& card_;
  /// Shared with the callbacks, which may still run when enumerate() has returned.
  const std::shared_ptr<CatalogueRecorder> recorder_;
  const ServiceProcess service_;
  std::shared_ptr<orvid::DeviceBrowser> browser_;
  std::shared_ptr<orvid::Device> device_;
};

}  // namespace brivo::bench
