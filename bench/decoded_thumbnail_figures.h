// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Thumbnails of JPEGs of 24 megapixels that have none, and what making them costs in memory.
void printDecodedThumbnailFigures(const Options& options);

}  // namespace brivo::bench
