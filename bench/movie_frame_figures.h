// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Thumbnails of a movie, where one can be made.
void printMovieFrameFigures(const Options& options);

}  // namespace brivo::bench
