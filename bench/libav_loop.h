// SPDX-License-Identifier: MIT
// What libavformat, libavcodec and libswscale alone do with a movie, in this process.
#pragma once

#include <string>

namespace brivo::bench {

/// Reads the first frame of a movie, scales it to a width of `pixels` by bicubic interpolation, and codes it
/// as a JPEG with quality 85. Throws when it cannot.
std::string firstFrameWithLibav(const std::string& path, unsigned pixels);

}  // namespace brivo::bench
