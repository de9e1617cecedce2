// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <string>
#include <string_view>

#include "access/access_database.h"
#include "platform/alerts/user_alerts.h"
#include "platform/applications/installed_applications.h"

namespace brivo {

/// Vendor prefix of bundle identifiers; what contains it is never revoked by the installation check.
inline constexpr std::string_view kVendorPrefix = "org.orvid.";

/// Decides whether an application may use a camera, from the grants in the database, and asks the user. All
/// calls block for each database step, and those that show an alert until the user has answered.
/// *Thread-safe.*
class OVDeviceAccessManager {
 public:
  /// `handled` says that the alert was answered, `response` how (UserAlert::Response).
  using AlertCompletion = std::function<void(bool handled, int response)>;

  /// `applications` must outlive the manager; so must `alerts`, which may be null when nobody can be asked.
  OVDeviceAccessManager(AccessDatabase& database, const InstalledApplications& applications,
                        UserAlerts* alerts)
      : database_(database), applications_(applications), alerts_(alerts) {}

  AccessDatabase& database() const { return database_; }

  /// The built-in applications always have access and control.
  static bool internalApplicationWithBundleIdentifierHasAccess(std::string_view bundleIdentifier);

  /// True when the grant may stand. The grant of an application that is not installed any more is revoked,
  /// unless its identifier contains the vendor prefix.
  bool validateBundleIdentifierInstalled(const std::string& bundleIdentifier, bool control);

  /// Whether there is an access grant; `enabled` receives its flag, and is left alone when there is none. Of
  /// several grants the last decides.
  bool applicationWithBundleIdentifierHasAccess(const std::string& bundleIdentifier, bool& enabled);
  bool controlApplicationWithBundleIdentifierHasAccess(const std::string& bundleIdentifier);

  /// Whether access is granted, asking the user with `alert` when there is no grant. Only the default button
  /// grants, and that is recorded; a grant that is not confirmed counts as refused without asking. Without an
  /// alert nobody is asked.
  bool validateBundleIdentifier(const std::string& bundleIdentifier, const Dictionary* alert);
  /// Whether control is granted. Without a grant the user is asked when there is an alert, and else it is;
  /// either way a grant is recorded, also after a refusal.
  bool validateControlApplicationBundleIdentifier(const std::string& bundleIdentifier,
                                                  const Dictionary* alert);

  /// Shows the alert, waits for the user and calls `completion`. When nobody can be asked it is not called.
  void displayAlertForApplication(const std::string& bundleIdentifier, const Dictionary& alert,
                                  const AlertCompletion& completion);

 private:
  /// Shows the alert and waits for its completion, however long that takes.
  bool userAllows(const std::string& bundleIdentifier, const Dictionary& alert);

  AccessDatabase& database_;
  const InstalledApplications& applications_;
  UserAlerts* const alerts_;
};

}  // namespace brivo
