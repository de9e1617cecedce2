// SPDX-License-Identifier: MIT
#include "platform/volumes/volume_scan.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>

#include <algorithm>
#include <optional>

#include "platform/base/directory.h"
#include "platform/base/paths.h"
#include "platform/files/file_system.h"
#include "platform/text/unicode.h"
#include "platform/volumes/device_facts.h"

#ifndef STATX_MNT_ID_UNIQUE
#define STATX_MNT_ID_UNIQUE 0x00004000U
#endif

namespace brivo {

namespace {

/// Never waits for the medium: what is cached will do.
constexpr int kNoWaiting = AT_SYMLINK_NOFOLLOW | AT_NO_AUTOMOUNT | AT_STATX_DONT_SYNC;

using Status = struct statx;

std::optional<Status> status(int folder, const char* path, unsigned mask) {
  Status status{};
  if (::statx(folder, path, kNoWaiting, mask, &status) != 0) return std::nullopt;
  return status;
}

std::string birth(const Status& status) {
  if ((status.stx_mask & STATX_BTIME) == 0) return "-";
  return fmt::format("{}.{}", status.stx_btime.tv_sec, status.stx_btime.tv_nsec);
}

/// False when something else is mounted over a folder on the way to the mount.
bool isReachable(const Mount& mount) {
  const auto found = status(AT_FDCWD, mount.point.c_str(), STATX_MNT_ID);
  return found &&
         ((found->stx_mask & STATX_MNT_ID) == 0 || found->stx_mnt_id == static_cast<std::uint64_t>(mount.id));
}

/// Mount identifiers are used again at once, so that a card that was exchanged would look unchanged; the
/// unique ones (Linux 6.8) are not. Where there are none, all that tells two cards apart has to do.
std::string identityOf(const Mount& mount, const DeviceFacts& facts) {
  const auto found = status(AT_FDCWD, mount.point.c_str(), STATX_INO | STATX_BTIME | STATX_MNT_ID_UNIQUE);
  if (found && (found->stx_mask & STATX_MNT_ID_UNIQUE) != 0)
    return fmt::format("mount {}", found->stx_mnt_id);
  return fmt::format("{}:{} {} {} {} {} {}", mount.major, mount.minor, mount.type, mount.source,
                     facts.fileSystemUuid, found ? found->stx_ino : 0, found ? birth(*found) : "-");
}

std::string describe(const Mount& mount, const DeviceFacts& facts) {
  std::string text = facts.label.empty() ? mount.source : facts.label;
  for (const std::string& fact : {facts.fileSystemUuid, facts.bus}) {
    if (!fact.empty()) text += " " + fact;
  }
  if (facts.removable) text += " removable";
  return text;
}

}  // namespace

std::vector<VolumeCandidate> mountedCandidates(const std::vector<Mount>& table,
                                               const std::vector<std::string>& roots) {
  std::vector<VolumeCandidate> candidates;
  for (const Mount& mount : volumeMounts(table, roots)) {
    if (!isReachable(mount)) continue;
    const DeviceFacts facts = deviceFacts(mount.major, mount.minor);
    candidates.push_back({mount.point, identityOf(mount, facts), describe(mount, facts)});
  }
  return candidates;
}

std::vector<VolumeCandidate> folderCandidates(const std::string& folder) {
  std::vector<VolumeCandidate> candidates;
  const Directory directory = listDirectory(folder);
  if (!directory) return candidates;
  while (const dirent* entry = ::readdir(directory.get())) {
    if (entry->d_name[0] == '.') continue;
    const auto found = status(::dirfd(directory.get()), entry->d_name, STATX_TYPE | STATX_INO | STATX_BTIME);
    if (!found || !S_ISDIR(found->stx_mode)) continue;
    // With the birth time, because inode numbers are used again at once.
    const std::string identity = fmt::format("folder {}:{} {} {}", found->stx_dev_major, found->stx_dev_minor,
                                             found->stx_ino, birth(*found));
    candidates.push_back({appendingPathComponent(folder, entry->d_name), identity, "folder"});
  }
  std::ranges::sort(candidates, {}, &VolumeCandidate::path);
  return candidates;
}

bool containsPhotos(const std::string& path) {
  const auto names = systemFiles().names(path);
  return names.ok() && std::ranges::any_of(*names, [&](const std::string& name) {
           const std::string lower = asciiLowerCased(name);
           if (lower != "dcim" && lower != "mp_root") return false;
           const auto values = systemFiles().resourceValues(appendingPathComponent(path, name));
           return values.ok() && values->directory;
         });
}

}  // namespace brivo
