// SPDX-License-Identifier: MIT
#include "platform/volumes/volume_statistics.h"

#include <sys/statvfs.h>

#include <fstream>
#include <iterator>

#include "platform/volumes/mount_table.h"

namespace brivo {

VolumeStatistics volumeStatistics(const std::string& path) {
  VolumeStatistics statistics;
  struct statvfs status {};
  if (::statvfs(path.c_str(), &status) == 0) statistics.flags = status.f_flag;
  std::ifstream mountinfo("/proc/self/mountinfo");
  const auto table = parseMountTable(std::string(std::istreambuf_iterator<char>(mountinfo), {}));
  if (const Mount* mount = mountOf(table, path)) {
    statistics.typeName = mount->type;
    statistics.mountedOn = mount->point;
    statistics.mountedFrom = mount->source;
  }
  return statistics;
}

}  // namespace brivo
