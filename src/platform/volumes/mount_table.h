// SPDX-License-Identifier: MIT
// The kernel's list of mounts (proc_pid_mountinfo(5)). Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace brivo {

struct Mount {
  int id = 0;  ///< used again as soon as the mount is gone
  std::uint32_t major = 0;
  std::uint32_t minor = 0;
  std::string root;   ///< which folder of the file system is mounted
  std::string point;  ///< where, as bytes
  std::string type;   ///< of the file system, such as "exfat"
  std::string source;
  bool readOnly = false;  ///< of this mount or of the file system

  friend bool operator==(const Mount&, const Mount&) = default;
};

/// The mounts of a mountinfo text in its order. Lines that cannot be read are skipped.
std::vector<Mount> parseMountTable(std::string_view mountinfo);

/// The mounts that are volumes, in the order of the table: at or below one of `roots`, holding files of their
/// own (block devices and local FUSE file systems, not network or pseudo file systems, not automount traps),
/// not the root file system, not hidden under another mount of the same place, and each file system at its
/// first mount only.
std::vector<Mount> volumeMounts(const std::vector<Mount>& table, const std::vector<std::string>& roots);

/// The mount that `path` lies on, or null.
const Mount* mountOf(const std::vector<Mount>& table, std::string_view path);

}  // namespace brivo
