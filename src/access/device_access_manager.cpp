// SPDX-License-Identifier: MIT
#include "access/device_access_manager.h"

#include <algorithm>
#include <array>
#include <semaphore>

#include "util/log.h"

namespace brivo {

namespace {

constexpr std::array<std::string_view, 2> kBuiltIn{"org.orvid.Photos", "org.orvid.OrvidCoreTests"};

bool isFor(const Dictionary& row, const std::string& bundleIdentifier) {
  const std::string* identifier = row.string("bundle_id");
  return identifier && *identifier == bundleIdentifier;
}

}  // namespace

bool OVDeviceAccessManager::internalApplicationWithBundleIdentifierHasAccess(
    std::string_view bundleIdentifier) {
  return std::ranges::find(kBuiltIn, bundleIdentifier) != kBuiltIn.end();
}

bool OVDeviceAccessManager::validateBundleIdentifierInstalled(const std::string& bundleIdentifier,
                                                              bool control) {
  using Table = AccessDatabase::Table;
  const auto rows = database_.rowsOf(bundleIdentifier, control ? Table::control : Table::access);
  const auto matches = [&](const Dictionary& row) { return isFor(row, bundleIdentifier); };
  const bool installed = applications_.isInstalled(bundleIdentifier);
  if (installed && std::ranges::any_of(rows, matches)) return true;
  if (bundleIdentifier.find(kVendorPrefix) != std::string::npos) return true;
  OVLogError("ovaccess",
             "Bundle was not found to be installed on the device, revoking access defensively to require the "
             "user to "
             "re-authorize upon install.");
  if (installed) return false;  // no row: to delete none could only hit one that was stored since the look
  if (control) {
    database_.revokeControlApplicationWithBundleIdentifier(bundleIdentifier);
  } else {
    database_.revokeApplicationWithBundleIdentifier(bundleIdentifier);
  }
  return false;
}

bool OVDeviceAccessManager::applicationWithBundleIdentifierHasAccess(const std::string& bundleIdentifier,
                                                                     bool& enabled) {
  if (internalApplicationWithBundleIdentifierHasAccess(bundleIdentifier)) {
    enabled = true;
    return true;
  }
  validateBundleIdentifierInstalled(bundleIdentifier,
                                    false);  // what may not stand is revoked before the look
  bool found = false;
  for (const Dictionary& row : database_.bundleIdentifiersAccessingExternalCamerasWithStatus()) {
    if (!isFor(row, bundleIdentifier)) continue;
    enabled = row.boolean("whitelisted").value_or(false);
    found = true;
  }
  return found;
}

bool OVDeviceAccessManager::controlApplicationWithBundleIdentifierHasAccess(
    const std::string& bundleIdentifier) {
  if (internalApplicationWithBundleIdentifierHasAccess(bundleIdentifier)) return true;
  validateBundleIdentifierInstalled(bundleIdentifier, true);
  const auto identifiers = database_.bundleIdentifiersControllingExternalCameras();
  return std::ranges::find(identifiers, bundleIdentifier) != identifiers.end();
}

bool OVDeviceAccessManager::validateBundleIdentifier(const std::string& bundleIdentifier,
                                                     const Dictionary* alert) {
  bool enabled = false;
  if (applicationWithBundleIdentifierHasAccess(bundleIdentifier, enabled)) return enabled;
  if (!alert || !userAllows(bundleIdentifier, *alert)) return false;
  database_.addApplicationWithBundleIdentifier(bundleIdentifier, true);
  return true;
}

bool OVDeviceAccessManager::validateControlApplicationBundleIdentifier(const std::string& bundleIdentifier,
                                                                       const Dictionary* alert) {
  if (controlApplicationWithBundleIdentifierHasAccess(bundleIdentifier)) return true;
  const bool allowed = !alert || userAllows(bundleIdentifier, *alert);
  database_.addControlApplicationWithBundleIdentifier(bundleIdentifier, false);
  return allowed;
}

bool OVDeviceAccessManager::userAllows(const std::string& bundleIdentifier, const Dictionary& alert) {
  std::binary_semaphore answered(0);
  bool allowed = false;
  displayAlertForApplication(bundleIdentifier, alert, [&](bool handled, int response) {
    allowed = handled && response == UserAlert::defaultButton;
    answered.release();
  });
  answered.acquire();
  return allowed;
}

void OVDeviceAccessManager::displayAlertForApplication(const std::string& bundleIdentifier,
                                                       const Dictionary& alert,
                                                       const AlertCompletion& completion) {
  const auto shown = alerts_ ? alerts_->show(alert) : nullptr;
  if (!shown) return OVLogError("ovaccess", "nobody can be asked about {}", bundleIdentifier);
  const int response = shown->waitForResponse();
  completion(true, response);
}

}  // namespace brivo
