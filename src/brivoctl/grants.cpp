// SPDX-License-Identifier: MIT
#include "brivoctl/grants.h"

#include <algorithm>

#include "brivoctl/output.h"
#include "platform/base/paths.h"
#include "platform/settings/folders.h"
#include "platform/settings/settings.h"

namespace brivoctl {

namespace {

const std::string& madeBelowBase(const std::string& folder) {
  (void)brivo::makeBaseDirectory(std::string(brivo::parentPath(folder)));  // or else nothing can be stored
  return folder;
}

}  // namespace

AccessFile::AccessFile()
    : folder_(brivo::appendingPathComponent(brivo::Settings::fromEnvironment().dataHome,
                                            "org.orvid.imagecapture")),
      database_(pool_, madeBelowBase(folder_)) {}

ExitCode cannotStore(const AccessFile& file) {
  return fail("the access database in " + shown(file.folder()) +
              " cannot be written; BRIVOD_DEBUG=1 brivoctl says why");
}

ExitCode cannotRead(const AccessFile& file, const std::string& why) {
  return fail("the access database in " + shown(file.folder()) + " cannot be read: " + shown(why));
}

bool Grants::isKnown(const std::string& identifier) {
  return std::ranges::any_of(list(), [&](const Grant& grant) { return grant.identifier == identifier; });
}

bool Grants::isGranted(const std::string& identifier) {
  return std::ranges::any_of(
      list(), [&](const Grant& grant) { return grant.identifier == identifier && grant.isGranted; });
}

std::vector<Grant> AccessGrants::list() {
  std::vector<Grant> grants;
  for (const auto& row : database_.bundleIdentifiersAccessingExternalCamerasWithStatus()) {
    const std::string* identifier = row.string("bundle_id");
    grants.push_back({identifier ? *identifier : std::string(), row.boolean("whitelisted").value_or(false)});
  }
  return grants;
}

void AccessGrants::grant(const std::string& identifier) {
  if (isKnown(identifier)) {
    database_.updateApplicationWithBundleIdentifier(identifier, true);
  } else {
    database_.addApplicationWithBundleIdentifier(identifier, true);
  }
}

void AccessGrants::revoke(const std::string& identifier) {
  database_.revokeApplicationWithBundleIdentifier(identifier);
}

std::vector<Grant> ControlGrants::list() {
  std::vector<Grant> grants;
  for (std::string& identifier : database_.bundleIdentifiersControllingExternalCameras()) {
    grants.push_back({std::move(identifier), true});
  }
  return grants;
}

void ControlGrants::grant(const std::string& identifier) {
  if (!isKnown(identifier)) database_.addControlApplicationWithBundleIdentifier(identifier, true);
}

void ControlGrants::revoke(const std::string& identifier) {
  database_.revokeControlApplicationWithBundleIdentifier(identifier);
}

}  // namespace brivoctl
