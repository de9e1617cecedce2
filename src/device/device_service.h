// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <string>

#include "device/device_services.h"
#include "platform/zeph/listener.h"

namespace brivo {

class BrivoDevice;

/// What happens on a device's endpoint: which client processes are let in, and where each call goes. The
/// delegate of the device's listener and the object that its connections export.
class DeviceService final : public zeph::ListenerDelegate, public zeph::ExportedObject {
 public:
  /// `device` owns this.
  DeviceService(BrivoDevice& device, const DeviceServices& services) : device_(device), services_(services) {}

  /// Listener's queue. A connection is let in when its process has had none yet and its application has
  /// access that is enabled.
  bool shouldAcceptNewConnection(zeph::Listener& listener,
                                 const std::shared_ptr<zeph::Connection>& connection) override;
  /// Connection's queue.
  void handle(zeph::Invocation invocation) override;

 private:
  /// The access check. The decision stands for the process as long as that and the device live.
  bool acceptConnection(const zeph::Connection& connection);

  BrivoDevice& device_;
  const DeviceServices& services_;
  // The processes that were decided about, let in or refused, by their signing keys: identifier and process
  // identifier. Listener's queue.
  std::map<std::string, AuditToken> decided_;
};

}  // namespace brivo
