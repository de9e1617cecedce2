// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <string>

#include "device/brivo_device.h"
#include "platform/base/url.h"
#include "platform/base/value.h"

namespace brivo {

/// The record of one mounted volume, from the change that reports it to the change that does not any more. It
/// owns the device once a client has opened it. *Thread-bound* to the holder of the registry's lock.
class MSRemoteCameraDevice {
 public:
  /// Takes a fresh UUID string, the volume's handle for clients.
  explicit MSRemoteCameraDevice(Url url);

  const std::string& uuidString() const { return uuidString_; }
  /// Of the volume's mount point.
  const Url& url() const { return url_; }
  /// {"OVDevicePrimaryIdentifier": mount path, "OVDeviceHandle": UUID string}.
  Dictionary deviceContext() const;

  /// Null until the device was opened.
  const std::shared_ptr<BrivoDevice>& camera() const { return camera_; }
  void setCamera(std::shared_ptr<BrivoDevice> camera) { camera_ = std::move(camera); }
  /// Gives the device up; whoever drops the last share of it may have to wait for a medium.
  std::shared_ptr<BrivoDevice> takeCamera() { return std::move(camera_); }

 private:
  const std::string uuidString_;
  const Url url_;
  std::shared_ptr<BrivoDevice> camera_;
};

}  // namespace brivo
