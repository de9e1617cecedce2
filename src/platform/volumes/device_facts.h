// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

namespace brivo {

/// What udev and sysfs know of a block device; empty where there is no udev or no such device.
struct DeviceFacts {
  std::string fileSystemUuid;
  std::string label;
  std::string bus;  ///< such as "usb" or "mmc"
  bool removable = false;
};

/// *Thread-safe.*
DeviceFacts deviceFacts(std::uint32_t major, std::uint32_t minor);

}  // namespace brivo
