// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Thumbnails of two devices at once.
void printDeviceThumbnailFigure(const Options& options);

}  // namespace brivo::bench
