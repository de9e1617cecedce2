// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Thumbnails of 160 pixels that lie in JPEGs, one request at a time.
void printEmbeddedThumbnailFigures(const Options& options);

}  // namespace brivo::bench
