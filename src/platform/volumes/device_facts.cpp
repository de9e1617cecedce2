// SPDX-License-Identifier: MIT
#include "platform/volumes/device_facts.h"

#include <sys/sysmacros.h>
#include <systemd/sd-device.h>

namespace brivo {

namespace {

std::string property(sd_device* device, const char* name) {
  const char* value = nullptr;
  return sd_device_get_property_value(device, name, &value) >= 0 ? value : "";
}

/// Partitions have no attribute of their own; the disk that they belong to has.
bool isRemovable(sd_device* device) {
  const char* value = nullptr;
  if (sd_device_get_sysattr_value(device, "removable", &value) < 0) {
    sd_device* disk = nullptr;
    if (sd_device_get_parent(device, &disk) < 0) return false;
    if (sd_device_get_sysattr_value(disk, "removable", &value) < 0) return false;
  }
  return *value == '1';
}

}  // namespace

DeviceFacts deviceFacts(std::uint32_t major, std::uint32_t minor) {
  DeviceFacts facts;
  sd_device* device = nullptr;
  if (sd_device_new_from_devnum(&device, 'b', makedev(major, minor)) < 0) return facts;
  facts.fileSystemUuid = property(device, "ID_FS_UUID");
  facts.label = property(device, "ID_FS_LABEL");
  facts.bus = property(device, "ID_BUS");
  facts.removable = isRemovable(device);
  sd_device_unref(device);
  return facts;
}

}  // namespace brivo
