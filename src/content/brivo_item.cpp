// SPDX-License-Identifier: MIT
#include "content/brivo_item.h"

#include <atomic>

#include "platform/base/paths.h"

namespace brivo {

namespace {

std::atomic<std::uint32_t> nextHandle = 1;

std::uint64_t secondsSince1970(const FileTime& time) {
  return time.seconds < 0 ? 0 : static_cast<std::uint64_t>(time.seconds);
}

}  // namespace

BrivoItem::BrivoItem(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
                     const ResourceValues& values)
    : BrivoItem(values.directory || !parent ? ItemPath(std::move(path))
                                            : ItemPath(std::move(path), parent->path_, name),
                name, parent, device, values.size) {
  setCaptureDate(secondsSince1970(values.created));
  setModificationDate(secondsSince1970(values.modified));
  setProtectionStatus(values.writable ? 0 : 1);
  setObjHandle(nextHandle.fetch_add(1, std::memory_order_relaxed));
}

BrivoItem::BrivoItem(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
                     std::uint64_t size)
    : BrivoItem(ItemPath(std::move(path)), name, parent, device, size) {}

BrivoItem::BrivoItem(ItemPath path, std::string& name, const BrivoItem* parent, CameraDevice& device,
                     std::uint64_t size)
    : device_(device), path_(std::move(path)) {
  setFilename(std::move(name));
  setParentObject(parent ? parent->objHandle() : 0);
  setObjectCompressedSize(size);
}

std::optional<ResourceValues> BrivoItem::valuesOf(const std::string& path, CameraDevice& device,
                                                  const ResourceValues* prefetched) {
  if (prefetched) return *prefetched;
  const auto values = device.files().resourceValues(path);
  return values.ok() ? std::optional<ResourceValues>(*values) : std::nullopt;
}

bool BrivoItem::locked() const { return device_.isLocked() || info_.protectionStatus() == 1; }

int BrivoItem::compareObjectHandle(const BrivoItem& other) const {
  if (objHandle() == other.objHandle()) return 0;
  return other.objHandle() > objHandle() ? -1 : 1;
}

void BrivoItem::metadataWithOptions(const Dictionary&, const ResultHandler& reply) { reply({}); }

void BrivoItem::thumbnailDataWithOptions(const Dictionary&, const ResultHandler& reply) { reply({}); }

std::string_view baseName(std::string_view path) { return lastPathComponent(deletingPathExtension(path)); }

}  // namespace brivo
