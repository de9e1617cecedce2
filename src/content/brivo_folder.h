// SPDX-License-Identifier: MIT
#pragma once

#include "content/brivo_item.h"

namespace brivo {

class BrivoFile;

/// A directory on a volume.
class BrivoFolder final : public BrivoItem, public std::enable_shared_from_this<BrivoFolder> {
 public:
  /// Makes the item of the folder at `path`, with the handle 0xFFFFFFFE as its parent when it has none; null,
  /// with no handle taken, when the file system cannot tell its values. `prefetched` spares asking it.
  static std::shared_ptr<BrivoFolder> initWithFSURL(std::string path, std::string name,
                                                    const BrivoItem* parent, CameraDevice& device,
                                                    const ResourceValues* prefetched = nullptr);

  /// Starts the enumeration of this folder as a task of its own and returns at once. Sub-folders get the same
  /// options. "OVEnumerationChronologicalOrder": below 0 (the default) oldest first, above 0 newest first, 0
  /// by name.
  void enumerateContentWithOptions(const Dictionary& options);

  /// Makes a file of this folder and enters it in the device's index; null when it cannot be made. With
  /// `notify` a batch with this folder's own dataset is sent.
  std::shared_ptr<BrivoFile> newItemWithFSURL(std::string path, std::string name, bool notify,
                                              const ResourceValues* prefetched = nullptr);

  /// Sends serialised datasets to all clients as one content batch.
  void flushNotifications(Array datasets) const { device().flushNotifications(std::move(datasets)); }
  /// Sends this folder's own dataset in a batch of its own.
  void announce() const;

  /// This folder when the last component of `path` is its name, else null.
  std::shared_ptr<BrivoFolder> folderMatchingPath(std::string_view path);

  /// True for a folder named exactly "DCIM" or "MP_ROOT", which holds DCF folders and nothing else.
  bool isMediaRoot() const;

 private:
  BrivoFolder(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
              const ResourceValues& values);
};

}  // namespace brivo
