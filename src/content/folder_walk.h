// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <vector>

#include "content/brivo_folder.h"
#include "platform/files/file_system.h"

namespace brivo {

/// One folder's enumeration, in steps: list and sort, then the groups of files that share a base name, a few
/// at a time. Each valid entry becomes an item, is indexed and announced; sub-folders of a media root get a
/// walk of their own. Between steps nothing is held but the folder, and the device only weakly: when it has
/// gone, so is the walk. *Thread-bound* to the one step that runs.
class FolderWalk : public std::enable_shared_from_this<FolderWalk> {
 public:
  static void start(std::shared_ptr<BrivoFolder> folder, const Dictionary& options);

 private:
  using Group = std::vector<DirectoryEntry>;

  FolderWalk(std::shared_ptr<BrivoFolder> folder, const Dictionary& options);

  /// Runs one step if the device is still there.
  void step();
  void begin(CameraDevice& device);
  void enumerateSomeGroups(CameraDevice& device);
  void enumerate(Group& group);
  void enumerateMediaRootEntry(const DirectoryEntry& entry);
  void enumerateFolderEntry(const DirectoryEntry& entry, Array& batch);
  void dump(std::string_view name, const char* reason);
  void finish();
  void continueLater(CameraDevice& device);

  const std::shared_ptr<BrivoFolder> folder_;
  const std::weak_ptr<CameraDevice> device_;
  const Dictionary options_;

  bool begun_ = false;
  std::vector<Group> groups_;
  std::size_t nextGroup_ = 0;
  std::size_t dumpCount_ = 0;
};

/// Sorts entries by modification date and then by name: oldest first for an order below 0, newest first above
/// 0, by name alone for 0.
void sortEntries(std::vector<DirectoryEntry>& entries, std::int64_t chronologicalOrder);

}  // namespace brivo
