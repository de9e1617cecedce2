// SPDX-License-Identifier: MIT
#include "content/fs_camera_item.h"

#include "platform/base/paths.h"

namespace brivo {

namespace {

constexpr std::uint32_t kUserImmutable = 2;

}  // namespace

MSFSCameraItem MSFSCameraItem::initWithFSStructure(const FSStructure& entry) {
  return MSFSCameraItem(entry, (entry.flags & kUserImmutable) != 0);
}

std::optional<MSFSCameraItem> MSFSCameraItem::initWithFSURL(const std::string& path, FileSystem& files) {
  const auto values = files.resourceValues(path);
  if (!values.ok()) return std::nullopt;
  FSStructure entry;
  entry.name = lastPathComponent(path);
  entry.size = static_cast<std::int64_t>(values->size);
  entry.birthTime = {values->modified.seconds, 0};
  entry.modificationTime = entry.birthTime;
  return MSFSCameraItem(std::move(entry), !values->writable);
}

}  // namespace brivo
