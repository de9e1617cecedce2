// SPDX-License-Identifier: MIT
// What libjpeg-turbo alone does with a picture, in this process. It ends the program when it fails.
#pragma once

#include <cstddef>
#include <span>
#include <string>

namespace brivo::bench {

/// Reads a picture with the smallest scale, in eighths, that leaves its longer side not below `pixels`, and
/// codes it again with quality 85. Throws when there is no such file.
void scaleWithLibjpeg(const std::string& path, unsigned pixels);

/// The longer side of a JPEG, in pixels.
unsigned longerSideOf(std::span<const std::byte> jpeg);

}  // namespace brivo::bench
