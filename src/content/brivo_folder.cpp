// SPDX-License-Identifier: MIT
#include "content/brivo_folder.h"

#include "content/folder_walk.h"
#include "content/media/brivo_file.h"
#include "platform/base/paths.h"
#include "protocol/result_codes.h"
#include "util/log.h"

namespace brivo {

BrivoFolder::BrivoFolder(std::string path, std::string name, const BrivoItem* parent, CameraDevice& device,
                         const ResourceValues& values)
    : BrivoItem(std::move(path), std::move(name), parent, device, values) {
  mutableInfo().setAssociationType(1);
  if (!parent) setParentObject(kTopLevelParent);
}

std::shared_ptr<BrivoFolder> BrivoFolder::initWithFSURL(std::string path, std::string name,
                                                        const BrivoItem* parent, CameraDevice& device,
                                                        const ResourceValues* prefetched) {
  const auto values = valuesOf(path, device, prefetched);
  if (!values) return nullptr;
  return std::shared_ptr<BrivoFolder>(
      new BrivoFolder(std::move(path), std::move(name), parent, device, *values));
}

void BrivoFolder::enumerateContentWithOptions(const Dictionary& options) {
  FolderWalk::start(shared_from_this(), options);
}

std::shared_ptr<BrivoFile> BrivoFolder::newItemWithFSURL(std::string path, std::string name, bool notify,
                                                         const ResourceValues* prefetched) {
  auto file = BrivoFile::initWithFSURL(std::move(path), std::move(name), this, device(), prefetched);
  if (!file) return nullptr;
  OVLogVerbose(kLogTypeDetail, file->name(), "File queued: {}\n", file->path());
  device().addCameraFileToIndex(file);
  if (notify) announce();
  return file;
}

void BrivoFolder::announce() const {
  Array own(Array::Kind::data);
  own.append(info().content());
  flushNotifications(std::move(own));
}

std::shared_ptr<BrivoFolder> BrivoFolder::folderMatchingPath(std::string_view path) {
  return lastPathComponent(path) == name() ? shared_from_this() : nullptr;
}

bool BrivoFolder::isMediaRoot() const { return name() == "DCIM" || name() == "MP_ROOT"; }

}  // namespace brivo
