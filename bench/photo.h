// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo::bench {

/// The size of pictures of 24 megapixels.
inline constexpr unsigned kPhotoWidth = 6000;
inline constexpr unsigned kPhotoHeight = 4000;

/// A JPEG file that costs a decoder what a camera's does: smooth colours under the noise of a sensor, about 9
/// MB for 24 megapixels. The same bytes for the same size; without a thumbnail.
std::string makePhoto(unsigned width = kPhotoWidth, unsigned height = kPhotoHeight);

}  // namespace brivo::bench
