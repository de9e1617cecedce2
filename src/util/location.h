// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "platform/base/value.h"

namespace brivo {

/// Reads a location in signed degrees (ISO 6709), such as "+37.3349-122.0090+010.000/", and sets "{GPS}" in
/// `properties` to "Latitude" and "Longitude" (degrees without sign), "LatitudeRef" ("N" or "S"),
/// "LongitudeRef" ("E" or "W") and, with an altitude, "Altitude" (metres without sign) and "AltitudeRef",
/// which is always 0. Nothing is set without either argument, or with fewer than two numbers. *Thread-safe.*
void OVCreateGPSDictionaryFromString(const std::string* location, Dictionary* properties);

}  // namespace brivo
