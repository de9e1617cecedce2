// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "content/brivo_folder.h"
#include "content/media/brivo_file.h"
#include "device/catalogue_counters.h"
#include "platform/base/mutex.h"

namespace brivo {

/// The items of a device by object handle, folders and files apart. Look-ups, insertions and removals take a
/// time that grows with the logarithm of the number of items. *Thread-safe.*
class ObjectIndex {
 public:
  /// `counters` counts the files and must outlive the index.
  explicit ObjectIndex(CatalogueCounters& counters) : counters_(counters) {}

  /// Enters a file; any other item is ignored. The same file entered twice is there once but counted twice.
  void addCameraFileToIndex(const std::shared_ptr<BrivoItem>& item) BRIVO_EXCLUDES(mediaLock_);
  /// Enters a folder; any other item is ignored.
  void addCameraFolderToIndex(const std::shared_ptr<BrivoItem>& item) BRIVO_EXCLUDES(mediaLock_);

  // Null when there is none.
  std::shared_ptr<BrivoFile> cameraFileWithObjectID(std::uint64_t handle) const BRIVO_EXCLUDES(mediaLock_);
  std::shared_ptr<BrivoFolder> cameraFolderWithObjectID(std::uint64_t handle) const
      BRIVO_EXCLUDES(mediaLock_);
  /// A file with the handle, else a folder.
  std::shared_ptr<BrivoItem> cameraItemWithObjectID(std::uint64_t handle) const;

  void removeCameraFileFromIndex(std::uint64_t handle) BRIVO_EXCLUDES(mediaLock_);
  /// All folders, then all files, each in the order of their handles.
  std::vector<std::shared_ptr<BrivoItem>> copyIndexedFoldersAndFiles() const BRIVO_EXCLUDES(mediaLock_);

  /// Deletes the item's file, and with a file the one named "THM" in the folder that has the file's base
  /// name, and takes it out of the index. False, with nothing changed, for a locked item and when the file
  /// cannot be deleted; a file that is gone already counts as deleted.
  bool deleteFile(const std::shared_ptr<BrivoItem>& item);

  /// Entries in the sub-folders of a directory, hidden ones aside; each step is logged.
  static std::size_t itemsInFolder(const std::string& directory, FileSystem& files);

 private:
  CatalogueCounters& counters_;

  mutable Mutex mediaLock_;
  std::map<std::uint64_t, std::shared_ptr<BrivoFolder>> indexedFolders_ BRIVO_GUARDED_BY(mediaLock_);
  std::map<std::uint64_t, std::shared_ptr<BrivoFile>> indexedFiles_ BRIVO_GUARDED_BY(mediaLock_);
};

}  // namespace brivo
