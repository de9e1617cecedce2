// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/files/file_system.h"

namespace brivo {

/// One entry of a directory walk with its stat record.
struct FSStructure {
  std::string name;
  std::uint64_t ino = 0;
  std::int64_t size = 0;
  /// File flags; bit 1 is the user-immutable flag.
  std::uint32_t flags = 0;
  FileTime birthTime;
  FileTime modificationTime;
};

/// A read-only record of one directory entry's attributes. *Immutable.*
class MSFSCameraItem {
 public:
  static MSFSCameraItem initWithFSStructure(const FSStructure& entry);
  /// Both times are the seconds of the modification time; inode and flags stay 0. None when the file system
  /// cannot tell.
  static std::optional<MSFSCameraItem> initWithFSURL(const std::string& path, FileSystem& files);

  bool locked() const { return locked_; }
  std::uint32_t flags() const { return entry_.flags; }
  const std::string& name() const { return entry_.name; }
  std::uint64_t ino() const { return entry_.ino; }
  /// Bytes.
  std::int64_t size() const { return entry_.size; }
  const FileTime& creationTimeSpec() const { return entry_.birthTime; }
  const FileTime& modificationTimeSpec() const { return entry_.modificationTime; }
  /// Seconds since 1970.
  std::int64_t creationTime() const { return entry_.birthTime.seconds; }
  std::int64_t modificationTime() const { return entry_.modificationTime.seconds; }

 private:
  MSFSCameraItem(FSStructure entry, bool locked) : entry_(std::move(entry)), locked_(locked) {}

  FSStructure entry_;
  bool locked_;
};

}  // namespace brivo
