// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <string>

namespace brivo::bench {

/// JPEGs in a file of makeRawFile(): a thumbnail and three previews.
inline constexpr std::size_t kJpegsOfRawFile = 4;

/// Makes a file that is laid out as a camera's raw file is: TIFF with a 160 × 120 thumbnail in the second
/// directory, previews of 640, 1620 and 6000 pixels and the sensor's 50 MB in four sub-directories. The JPEGs
/// have headers alone, and the sensor's data take no block on the disk.
void makeRawFile(const std::string& path);

}  // namespace brivo::bench
