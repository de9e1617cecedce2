// SPDX-License-Identifier: MIT
#include "daemon/remote_camera_device.h"

#include "platform/base/uuid.h"
#include "platform/text/unicode.h"
#include "protocol/keys.h"

namespace brivo {

MSRemoteCameraDevice::MSRemoteCameraDevice(Url url) : uuidString_(randomUuidString()), url_(std::move(url)) {}

Dictionary MSRemoteCameraDevice::deviceContext() const {
  Dictionary context;
  context.set(keys::kDevicePrimaryIdentifier, replacingInvalidUtf8(url_.path()));
  context.set(keys::kDeviceHandle, uuidString_);
  return context;
}

}  // namespace brivo
