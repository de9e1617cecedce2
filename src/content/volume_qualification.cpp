// SPDX-License-Identifier: MIT
#include "content/volume_qualification.h"

#include "platform/base/paths.h"
#include "util/log.h"

namespace brivo {

namespace {

constexpr const char* kMissing = "⚠️⚠️⚠️⚠️⚠️⚠️ - Missing";

/// The names that the list gives, or the default when it does not say.
Array folderNames(const Dictionary& matchingList) {
  if (const Array* classes = matchingList.array("cameraClasses")) {
    for (const Value& entry : *classes) {
      const auto* cameraClass = entry.get<Dictionary>();
      const std::string* name = cameraClass ? cameraClass->string("class") : nullptr;
      if (!name || *name != "BrivoDeviceManager") continue;
      if (const Array* names = cameraClass->array("volumeInfo")) return *names;
      break;
    }
  }
  return {"DCIM"};
}

std::vector<std::string> mediaFolders(const std::string& volumePath, const Array& names, FileSystem& files) {
  std::vector<std::string> found;
  for (const Value& value : names) {
    const auto* name = value.get<std::string>();
    if (!name) continue;
    const auto values = files.resourceValues(appendingPathComponent(volumePath, *name));
    if (values.ok() && values->directory) found.push_back(*name);
  }
  return found;
}

}  // namespace

bool IsSupportedMassStorageCameraVolume(const std::optional<std::string>& volumePath,
                                        std::vector<std::string>* mediaPaths,
                                        const std::optional<Dictionary>& matchingList, FileSystem& files) {
  std::vector<std::string> found;
  if (!volumePath) {
    OVLogError("volume", "{}", kMissing);
  } else {
    OVLog("", "{}", *volumePath);
    if (!matchingList) {
      OVLogError("matchPlist", "{}", kMissing);
    } else {
      found = mediaFolders(*volumePath, folderNames(*matchingList), files);
    }
  }
  const bool supported = !found.empty();
  if (mediaPaths) {
    *mediaPaths = std::move(found);
  } else {
    OVLogError("mediaPaths", "{}", kMissing);
  }
  return supported;
}

}  // namespace brivo
