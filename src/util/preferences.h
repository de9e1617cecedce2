// SPDX-License-Identifier: MIT
// The logging level and the throttle settings in the framework's preferences domain.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace brivo {

/// The domain that the functions below read.
extern std::string OVPreferencesDomain;

/// Sets OVLoggingLevel from the stored "loggingLevel". When nothing usable is stored (a number
/// above 0) and the level is 0, the level becomes 3075 (bits 0, 1, 10 and 11) and is stored. A
/// store that cannot be written is logged. *Thread-safe.*
void __OVReadPrefs();

/// "throttleSwitch": 0 or 1, 0 when not stored. "throttleSilder" (that spelling): the number stored
/// under "throttleSlider", 1024 when not stored. Any other key: 0. *Thread-safe.*
std::uint32_t OVQueryOrvidDefault(std::string_view key);

}  // namespace brivo
