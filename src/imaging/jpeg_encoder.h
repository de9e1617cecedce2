// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <vector>

#include "imaging/picture.h"

namespace brivo::imaging {

/// A baseline JPEG file (JFIF) of a picture whose frame is as scaledForJpeg() gives it, with the ICC profile
/// when there is one. Empty when the encoder fails.
std::vector<std::byte> encodeJpeg(const Picture& picture);

}  // namespace brivo::imaging
