// SPDX-License-Identifier: MIT
// Which volumes are there: mounted cards and the sub-folders of volume folders.
#pragma once

#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/base/result.h"
#include "platform/base/url.h"

namespace brivo {

/// A place that holds files, as the monitor reports it.
struct StorageDomain {
  /// Unique among the domains of one report.
  std::string identifier;
  /// A "DCIM" or "MP_ROOT" folder, in any letter case, lies directly under its root.
  bool containsPhotos = false;
  std::vector<Url> storageURLs;
};

/// The current domains by identifier, or why they cannot be told.
using DomainReport = Result<std::map<std::string, StorageDomain>>;
using DomainChangeHandler = std::function<void(const DomainReport&)>;

/// Reports domain changes until it is ended. *Thread-safe.*
class DomainMonitor {
 public:
  /// Stands for one begun monitoring. Opaque.
  using Token = std::shared_ptr<void>;

  virtual ~DomainMonitor() = default;

  /// Calls `handler` on the monitor's own thread, one call at a time, with the domains there are now and
  /// after every change. Volumes that answer promptly have been reported when this returns. Null when
  /// monitoring cannot begin; the handler has then heard why.
  virtual Token beginMonitoring(DomainChangeHandler handler) = 0;
  /// Returns when no handler runs any more. Must not be called by the handler.
  virtual void endMonitoring(const Token& token) = 0;
};

}  // namespace brivo
