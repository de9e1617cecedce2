// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "orvidcore/device.h"
#include "orvidcore/result.h"

namespace orvid {

/// Hears of devices that come and go. Every member may be empty; they run one at a time, on a thread of the
/// library.
struct BrowserEvents {
  std::function<void(const DeviceInfo&)> onAdded;
  std::function<void(const DeviceInfo&)> onRemoved;
  /// The service has gone. Nothing comes after it.
  std::function<void()> onClosed;
};

/// The connection to the service. A process should have one: the service ends all of a process's connections
/// with one of them, and lets a process open each device once. *Thread-safe.*
class DeviceBrowser {
 public:
  /// Connects to the service at a D-Bus address, or where the service of this user is when it is empty.
  static Result<std::shared_ptr<DeviceBrowser>> connect(const std::string& address = "",
                                                        Timeout timeout = kDefaultTimeout);
  /// Ends the connection and the sessions of the devices that it opened. When it returns, no event is being
  /// told any more, except the one that it is called from.
  ~DeviceBrowser();
  DeviceBrowser(const DeviceBrowser&) = delete;
  DeviceBrowser& operator=(const DeviceBrowser&) = delete;

  void setEvents(BrowserEvents events);

  Result<std::vector<DeviceInfo>> devices(Timeout timeout = kDefaultTimeout) const;
  void devicesAsync(Callback<std::vector<DeviceInfo>> done, Timeout timeout = kDefaultTimeout) const;

  /// Opens a device, or gives the session that is open already.
  Result<std::shared_ptr<Device>> open(const DeviceInfo& device, Timeout timeout = kDefaultTimeout);
  void openAsync(const DeviceInfo& device, Callback<std::shared_ptr<Device>> done,
                 Timeout timeout = kDefaultTimeout);

 private:
  class Implementation;
  explicit DeviceBrowser(std::shared_ptr<Implementation> implementation);

  const std::shared_ptr<Implementation> implementation_;
};

}  // namespace orvid
