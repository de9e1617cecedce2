// SPDX-License-Identifier: MIT
#include "util/preferences.h"

#include <limits>

#include "platform/preferences/preferences_store.h"
#include "platform/settings/settings.h"
#include "util/log.h"

namespace brivo {

std::string OVPreferencesDomain = "org.orvid.OrvidCore";

namespace {

constexpr unsigned kDefaultLevel = 3075;
constexpr std::uint32_t kDefaultSlider = 1024;

PreferencesStore store() { return PreferencesStore(Settings::fromEnvironment().configHome); }

}  // namespace

void __OVReadPrefs() {
  Dictionary preferences = store().read(OVPreferencesDomain);
  const auto stored = preferences.unsignedInteger("loggingLevel");
  if (stored && *stored != 0) {
    OVLoggingLevel = static_cast<unsigned>(*stored);
    return;
  }
  if (OVLoggingLevel != 0) return;
  OVLoggingLevel = kDefaultLevel;
  preferences.set("loggingLevel", kDefaultLevel);
  if (const auto error = store().write(OVPreferencesDomain, preferences)) {
    OVLogError("preferences", "{}", error->text());
  }
}

std::uint32_t OVQueryOrvidDefault(std::string_view key) {
  if (key == "throttleSwitch") {
    return store().read(OVPreferencesDomain).boolean("throttleSwitch").value_or(false) ? 1 : 0;
  }
  if (key == "throttleSilder") {
    const auto slider = store().read(OVPreferencesDomain).real("throttleSlider");
    if (!slider) return kDefaultSlider;
    constexpr double most = std::numeric_limits<std::uint32_t>::max();
    if (!(*slider > 0)) return 0;
    return static_cast<std::uint32_t>(*slider < most ? *slider : most);
  }
  return 0;
}

}  // namespace brivo
