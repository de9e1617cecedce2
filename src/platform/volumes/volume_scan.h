// SPDX-License-Identifier: MIT
// One look at what could be a volume right now.
#pragma once

#include <string>
#include <vector>

#include "platform/volumes/mount_table.h"

namespace brivo {

/// A folder that may turn out to hold photos.
struct VolumeCandidate {
  std::string path;
  /// Changes when something else has taken the place, even if everything in it looks the same.
  std::string identity;
  /// For people: label, bus and the like, where they are known.
  std::string description;
};

/// The mounted volumes of `table` at or below `roots` (mount points as canonical paths).
std::vector<VolumeCandidate> mountedCandidates(const std::vector<Mount>& table,
                                               const std::vector<std::string>& roots);

/// The sub-folders of `folder`, hidden ones and symbolic links aside; empty when it cannot be listed.
std::vector<VolumeCandidate> folderCandidates(const std::string& folder);

/// True when a folder "DCIM" or "MP_ROOT", in any letter case, lies directly under `path` (the rule for
/// x-content/image-dcf of the shared MIME database). Blocks as long as the medium does.
bool containsPhotos(const std::string& path);

}  // namespace brivo
