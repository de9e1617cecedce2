// SPDX-License-Identifier: MIT
#include "device/object_index.h"

#include <cerrno>

#include "platform/base/paths.h"
#include "util/log.h"

namespace brivo {

namespace {

constexpr std::uint32_t kMinusOne = 0xFFFFFFFF;

/// Enters `item` when it is a T that is not there yet; the hint makes entering in creation order cheap.
template <class T, class Map>
bool enter(Map& map, const std::shared_ptr<BrivoItem>& item) {
  auto typed = std::dynamic_pointer_cast<T>(item);
  if (!typed) return false;
  map.try_emplace(map.end(), item->unsignedIntegerValue(), std::move(typed));
  return true;
}

template <class Map>
typename Map::mapped_type find(const Map& map, std::uint64_t handle) {
  const auto found = map.find(handle);
  return found == map.end() ? nullptr : found->second;
}

}  // namespace

void ObjectIndex::addCameraFileToIndex(const std::shared_ptr<BrivoItem>& item) {
  const MutexLock lock(mediaLock_);
  if (enter<BrivoFile>(indexedFiles_, item)) counters_.updateEnumeratedItemCountWithDelta(1);
}

void ObjectIndex::addCameraFolderToIndex(const std::shared_ptr<BrivoItem>& item) {
  const MutexLock lock(mediaLock_);
  enter<BrivoFolder>(indexedFolders_, item);
}

std::shared_ptr<BrivoFile> ObjectIndex::cameraFileWithObjectID(std::uint64_t handle) const {
  const MutexLock lock(mediaLock_);
  return find(indexedFiles_, handle);
}

std::shared_ptr<BrivoFolder> ObjectIndex::cameraFolderWithObjectID(std::uint64_t handle) const {
  const MutexLock lock(mediaLock_);
  return find(indexedFolders_, handle);
}

std::shared_ptr<BrivoItem> ObjectIndex::cameraItemWithObjectID(std::uint64_t handle) const {
  if (auto file = cameraFileWithObjectID(handle)) return file;
  return cameraFolderWithObjectID(handle);
}

void ObjectIndex::removeCameraFileFromIndex(std::uint64_t handle) {
  {
    const MutexLock lock(mediaLock_);
    if (indexedFiles_.erase(handle) == 0) return;
  }
  counters_.updateEnumeratedItemCountWithDelta(kMinusOne);
}

std::vector<std::shared_ptr<BrivoItem>> ObjectIndex::copyIndexedFoldersAndFiles() const {
  std::vector<std::shared_ptr<BrivoItem>> items;
  const MutexLock lock(mediaLock_);
  items.reserve(indexedFolders_.size() + indexedFiles_.size());
  for (const auto& [handle, folder] : indexedFolders_) items.push_back(folder);
  for (const auto& [handle, file] : indexedFiles_) items.push_back(file);
  return items;
}

bool ObjectIndex::deleteFile(const std::shared_ptr<BrivoItem>& item) {
  if (item->locked()) return false;
  FileSystem& files = item->device().files();
  const auto failure = files.remove(item->path());
  if (failure && failure->code != ENOENT) return false;
  if (!failure && std::dynamic_pointer_cast<BrivoFile>(item)) {
    (void)files.remove(appendingPathComponent(deletingPathExtension(item->path()), "THM"));
  }
  removeCameraFileFromIndex(item->objHandle());
  return true;
}

std::size_t ObjectIndex::itemsInFolder(const std::string& directory, FileSystem& files) {
  std::size_t total = 0;
  const auto entries = files.names(directory);
  if (!entries.ok()) return total;
  for (const std::string& name : *entries) {
    const std::string path = appendingPathComponent(directory, name);
    const auto inside = files.names(path);
    total += inside.ok() ? inside->size() : 0;
    OVLog("content", "[{:05}] - {}", total, Url::file(path).text());
  }
  return total;
}

}  // namespace brivo
