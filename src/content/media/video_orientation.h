// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <vector>

#include "platform/movies/movie_description.h"

namespace brivo {

/// The orientation that the first of `tracks` is to be shown with: 1, 4, 6 or 8, by the whole degrees that
/// its transform turns the picture by; 0 when there is none. Not what EXIF makes of the same turns: half a
/// turn is 8, and a quarter turn counter-clockwise 4. Mirroring is not looked at.
std::uint32_t videoOrientation(const std::vector<VideoTrack>& tracks);

}  // namespace brivo
