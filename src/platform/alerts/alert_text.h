// SPDX-License-Identifier: MIT
// What an alert says, fit to be sent. Pure and *thread-safe*.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "platform/alerts/user_alerts.h"

namespace brivo {

/// The texts of an alert: UTF-8 that every D-Bus implementation takes, no control characters but line ends in
/// the message, and no longer than a screen can show.
struct AlertText {
  struct Button {
    UserAlert::Response response;
    std::string label;
  };

  std::string title;  ///< one line
  std::string message;
  std::vector<Button> buttons;  ///< those that have a text, the default one first

  static AlertText from(const Dictionary& alert);
};

/// `text` for a server that takes markup (Desktop Notifications Specification, "Markup"): it reads as it is.
std::string escapingMarkup(std::string_view text);

}  // namespace brivo
