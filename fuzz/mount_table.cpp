// SPDX-License-Identifier: MIT
#include "platform/volumes/mount_table.h"

#include <algorithm>

#include "check.h"

// Volumes are mounts of the table, at or below the roots.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto table = brivo::parseMountTable(textOf(data, size));
  const auto volumes = brivo::volumeMounts(table, {"/media", "/mnt"});
  for (const auto& volume : volumes) {
    check(std::ranges::find(table, volume) != table.end());
    check(volume.point.starts_with("/media") || volume.point.starts_with("/mnt"));
    check(brivo::mountOf(table, volume.point + "/DCIM") != nullptr);
  }
  return 0;
}
