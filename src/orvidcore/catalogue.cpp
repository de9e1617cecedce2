// SPDX-License-Identifier: MIT
#include "orvidcore/catalogue.h"

#include <algorithm>
#include <functional>

#include "protocol/result_codes.h"
#include "ptp/object_info_dataset.h"

namespace orvid {

namespace {

constexpr int kDeepestFolder = 32;  // of a path; a folder that contains itself has no end

ObjectInfo infoOf(const brivo::MSObjectInfoDataset& dataset) {
  ObjectInfo info;
  info.handle = dataset.objectHandle();
  info.parent = dataset.parentObject();
  info.name = dataset.filename();
  info.isFolder = dataset.associationType() == 1;
  info.isProtected = dataset.protectionStatus() != 0;
  info.size = dataset.objectCompressedSize();
  info.width = dataset.imagePixWidth();
  info.height = dataset.imagePixHeight();
  info.orientation = dataset.imageOrietation();
  info.captured = dataset.captureDate_tvsec();
  info.modified = dataset.modificationDate_tvsec();
  info.thumbOffset = dataset.thumbOffset();
  info.thumbSize = dataset.thumbCompressedSize();
  info.thumbWidth = dataset.thumbPixWidth();
  info.thumbHeight = dataset.thumbPixHeight();
  return info;
}

}  // namespace

void Catalogue::ready(std::int32_t objectCount) {
  const brivo::MutexLock lock(mutex_);
  expected_ = static_cast<std::size_t>(std::max(0, objectCount));
  lastArrival_ = Clock::now();
  changed_.notify_all();
}

std::vector<ObjectInfo> Catalogue::add(const brivo::Array& datasets) {
  std::vector<ObjectInfo> added;
  const brivo::MutexLock lock(mutex_);
  for (const brivo::Value& value : datasets) {
    const auto* data = value.get<brivo::Data>();
    if (!data || !brivo::MSObjectInfoDataset::isComplete(data->bytes())) continue;
    ObjectInfo info = infoOf(brivo::MSObjectInfoDataset(*data));
    added.push_back(info);
    objects_.insert_or_assign(info.handle, std::move(info));
  }
  for (ObjectInfo& info : added) info.path = pathOf(info);
  lastArrival_ = Clock::now();
  changed_.notify_all();
  return added;
}

std::string Catalogue::pathOf(const ObjectInfo& info) const {
  std::string path = info.name;
  std::uint32_t parent = info.parent;
  for (int depth = 0; parent != brivo::kTopLevelParent && depth < kDeepestFolder; ++depth) {
    const auto folder = objects_.find(parent);
    if (folder == objects_.end()) break;
    path.insert(0, folder->second.name + "/");
    parent = folder->second.parent;
  }
  return path;
}

ObjectInfo Catalogue::withPath(ObjectInfo info) const {
  info.path = pathOf(info);
  return info;
}

void Catalogue::remove(std::uint32_t handle) {
  const brivo::MutexLock lock(mutex_);
  objects_.erase(handle);
}

void Catalogue::close() {
  const brivo::MutexLock lock(mutex_);
  closed_ = true;
  changed_.notify_all();
}

std::optional<ObjectInfo> Catalogue::find(std::uint32_t handle) const {
  const brivo::MutexLock lock(mutex_);
  const auto found = objects_.find(handle);
  return found == objects_.end() ? std::nullopt : std::optional(withPath(found->second));
}

std::vector<ObjectInfo> Catalogue::all() const {
  std::vector<ObjectInfo> infos;
  {
    const brivo::MutexLock lock(mutex_);
    for (const auto& [handle, info] : objects_) infos.push_back(withPath(info));
  }
  std::stable_partition(infos.begin(), infos.end(), std::mem_fn(&ObjectInfo::isFolder));
  return infos;
}

Catalogue::Wait Catalogue::waitUntilSettled(Timeout timeout) {
  const auto deadline = Clock::now() + timeout;
  auto outcome = Wait::tooLong;
  mutex_.lock();
  while (true) {
    const auto now = Clock::now();
    const auto quiet = expected_ ? lastArrival_ + kQuietTime : deadline;
    if (closed_) {
      outcome = Wait::closed;
      break;
    }
    if (expected_ && (objects_.size() >= *expected_ || now >= quiet)) {
      outcome = Wait::settled;
      break;
    }
    if (now >= deadline) break;
    changed_.wait_until(mutex_, std::min(quiet, deadline));
  }
  mutex_.unlock();
  return outcome;
}

}  // namespace orvid
