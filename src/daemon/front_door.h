// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "daemon/device_manager.h"
#include "platform/work/run_loop.h"
#include "platform/zeph/door.h"

namespace brivo {

/// Says where those who come over the session bus go: to the manager, or to a device that is opened for them.
/// What they may do there is decided there. *Thread-safe.*
class FrontDoor final : public zeph::Doorkeeper {
 public:
  /// The name on the session bus.
  static constexpr const char* kName = "org.orvid.brivod";
  /// The answer when no device has the UUID.
  static constexpr const char* kErrorUnknownDevice = "org.orvid.FrontDoor1.Error.UnknownDevice";

  /// Bytes of a UUID in canonical form.
  static constexpr std::size_t kLongestHandle = 36;
  /// What the caller is told of a handle that no device has.
  static zeph::CallError unknownDevice() {
    return {kErrorUnknownDevice, "There is no device with this handle"};
  }

  /// Opens devices on `mainLoop`, which must outlive this.
  FrontDoor(RunLoop& mainLoop, std::shared_ptr<zeph::Listener> managerListener,
            std::weak_ptr<MSRemoteCameraDeviceManager> manager)
      : mainLoop_(mainLoop), managerListener_(std::move(managerListener)), manager_(std::move(manager)) {}

  void visited(zeph::Visit visit) override;

 private:
  RunLoop& mainLoop_;
  const std::shared_ptr<zeph::Listener> managerListener_;
  const std::weak_ptr<MSRemoteCameraDeviceManager> manager_;
};

}  // namespace brivo
