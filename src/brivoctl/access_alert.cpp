// SPDX-License-Identifier: MIT
#include "brivoctl/access_alert.h"

#include "access/localized_string.h"
#include "brivoctl/output.h"

namespace brivoctl {

namespace {

using brivo::OVLocalizedString;

/// `text` with the application in the place of "{}".
std::string about(const std::string& identifier, std::string text) {
  const auto place = text.find("{}");
  if (place != std::string::npos) text.replace(place, 2, shown(identifier));
  return text;
}

brivo::Dictionary question(const std::string& title, const std::string& message) {
  return {{"title", title},
          {"message", message},
          {"defaultButton", OVLocalizedString("Allow")},
          {"alternateButton", OVLocalizedString("Do Not Allow")}};
}

}  // namespace

brivo::Dictionary accessAlert(const std::string& identifier) {
  const auto text = OVLocalizedString(
      // Translators: {} is an application, such as org.example.Photos or /usr/bin/photos.
      "{} could see, copy and delete the pictures and movies on every camera card.");
  return question(OVLocalizedString("Let an application use your cameras?"), about(identifier, text));
}

brivo::Dictionary controlAlert(const std::string& identifier) {
  const auto text = OVLocalizedString(
      // Translators: {} is an application, such as org.example.Photos or /usr/bin/photos.
      "{} could change the settings of your cameras and take pictures with them.");
  return question(OVLocalizedString("Let an application control your cameras?"), about(identifier, text));
}

}  // namespace brivoctl
