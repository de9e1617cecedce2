// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

namespace brivo {

/// What the system says of the file system that a path lies on.
struct VolumeStatistics {
  std::uint64_t flags = 0;  ///< mount flags of statvfs(3); bit 0 (ST_RDONLY): mounted read-only
  std::string typeName;
  std::string mountedOn;
  std::string mountedFrom;
};

/// All zero and empty where nothing can be said. Blocks as long as the medium does. *Thread-safe.*
VolumeStatistics volumeStatistics(const std::string& path);

}  // namespace brivo
