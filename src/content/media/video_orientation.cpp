// SPDX-License-Identifier: MIT
#include "content/media/video_orientation.h"

#include <cmath>
#include <numbers>

namespace brivo {

std::uint32_t videoOrientation(const std::vector<VideoTrack>& tracks) {
  if (tracks.empty()) return 0;
  const AffineTransform& transform = tracks.front().preferredTransform;
  const double degrees = std::atan2(transform.b, transform.a) * 180 / std::numbers::pi;
  switch (static_cast<int>(degrees)) {
    case -90:
      return 4;
    case 90:
      return 6;
    case 180:
      return 8;
    default:
      return 1;
  }
}

}  // namespace brivo
