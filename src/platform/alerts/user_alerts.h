// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "platform/base/value.h"

namespace brivo {

/// A question on the user's screen. It leaves the screen when this goes.
class UserAlert {
 public:
  /// What the user pressed.
  enum Response { defaultButton = 0, alternateButton = 1, otherButton = 2, dismissed = 3 };

  virtual ~UserAlert() = default;
  /// Waits, without limit, for the user.
  virtual Response waitForResponse() = 0;
};

/// Asks the user. *Thread-safe.*
class UserAlerts {
 public:
  virtual ~UserAlerts() = default;
  /// Shows an alert with the texts under "title", "message", "defaultButton", "alternateButton" and
  /// "otherButton". Null when nobody can be asked.
  virtual std::unique_ptr<UserAlert> show(const Dictionary& alert) = 0;
};

}  // namespace brivo
