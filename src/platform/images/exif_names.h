// SPDX-License-Identifier: MIT
// The names of tags, after CIPA DC-008 / JEITA CP-3451 (EXIF 2.32): the attributes of the TIFF, EXIF and GPS
// directories. Pure and *thread-safe*.
#pragma once

#include <cstdint>
#include <optional>
#include <string_view>

#include "platform/images/exif_entries.h"

namespace brivo::images {

/// The name of a tag in its group; empty when it has none, or when its value says how the file is laid out
/// (pointers, strips, thumbnails, maker notes). GPS names go without the "GPS" before them.
std::string_view nameOfTag(ExifGroup group, std::uint16_t tag);

/// The tag of a name in its group.
std::optional<std::uint16_t> tagOfName(ExifGroup group, std::string_view name);

}  // namespace brivo::images
