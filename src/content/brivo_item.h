// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "content/camera_device.h"
#include "content/item_path.h"
#include "platform/base/value.h"
#include "platform/files/file_system.h"
#include "ptp/object_info_dataset.h"

namespace brivo {

/// The single answer of a request.
using ResultHandler = std::function<void(Dictionary)>;

/// Anything that a device presents to clients: a path on the volume with its dataset and its handle. Made on
/// any thread, not changed once it is in the device's index. An item may be asked things only while its
/// device lives.
class BrivoItem {
 public:
  virtual ~BrivoItem() = default;
  BrivoItem(const BrivoItem&) = delete;
  BrivoItem& operator=(const BrivoItem&) = delete;

  /// Four-character code of the kind of media, first character highest; 0 for folders.
  std::uint32_t type() const { return type_; }
  const MSObjectInfoDataset& info() const { return info_; }
  /// Absolute, as bytes.
  std::string path() const { return path_.of(filename()); }
  CameraDevice& device() const { return device_; }

  // What lives in the dataset.
  std::uint32_t objHandle() const { return info_.objectHandle(); }
  void setObjHandle(std::uint32_t handle) { info_.setObjectHandle(handle); }
  std::uint32_t parentObject() const { return info_.parentObject(); }
  void setParentObject(std::uint32_t handle) { info_.setParentObject(handle); }
  std::uint64_t objectCompressedSize() const { return info_.objectCompressedSize(); }
  void setObjectCompressedSize(std::uint64_t bytes) { info_.setObjectCompressedSize(bytes); }
  std::uint64_t fileSize() const { return objectCompressedSize(); }
  std::uint64_t size() const { return objectCompressedSize(); }
  bool protectionStatus() const { return info_.protectionStatus() != 0; }
  void setProtectionStatus(std::uint16_t status) { info_.setProtectionStatus(status); }
  const std::string& filename() const { return info_.filename(); }
  void setFilename(std::string name) { info_.setFilename(std::move(name)); }
  const std::string& name() const { return filename(); }
  /// Seconds since 1970, as is the next.
  std::uint64_t captureDate() const { return info_.captureDate_tvsec(); }
  void setCaptureDate(std::uint64_t seconds) { info_.setCaptureDate_tvsec(seconds); }
  std::uint64_t modificationDate() const { return info_.modificationDate_tvsec(); }
  void setModificationDate(std::uint64_t seconds) { info_.setModificationDate_tvsec(seconds); }

  /// True when the device is locked or the file itself cannot be written; such an item is not deleted.
  bool locked() const;
  /// 0 for the same handle, -1 when the other's is larger, +1 otherwise: ascending order.
  int compareObjectHandle(const BrivoItem& other) const;
  /// The handle, so that an item can stand where a handle number is expected.
  std::uint64_t unsignedIntegerValue() const { return objHandle(); }

  /// Answers once with the item's metadata; empty when it has none.
  virtual void metadataWithOptions(const Dictionary& options, const ResultHandler& reply);
  /// Answers once with what there is of a thumbnail and metadata; empty when there is nothing.
  virtual void thumbnailDataWithOptions(const Dictionary& options, const ResultHandler& reply);

 protected:
  /// A new item takes the next handle: one counter for all items of the process, from 1 on.
  BrivoItem(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
            const ResourceValues& values);
  /// A light item without a handle, for reading only.
  BrivoItem(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
            std::uint64_t size);

  /// `prefetched`, else what the file system says of `path`; none when it cannot be told.
  static std::optional<ResourceValues> valuesOf(const std::string& path, CameraDevice& device,
                                                const ResourceValues* prefetched);

  void setType(std::uint32_t type) { type_ = type; }
  MSObjectInfoDataset& mutableInfo() { return info_; }

 private:
  BrivoItem(ItemPath path, std::string& name, const BrivoItem* parent, CameraDevice& device,
            std::uint64_t size);

  CameraDevice& device_;
  const ItemPath path_;
  MSObjectInfoDataset info_;
  std::uint32_t type_ = 0;
};

/// The last component of a path without its extension: the key by which the files of one shot are grouped.
std::string_view baseName(std::string_view path);

}  // namespace brivo
