// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Thumbnails of a HEIC picture of 12 megapixels, where one can be made.
void printHeicFigures(const Options& options);

}  // namespace brivo::bench
