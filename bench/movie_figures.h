// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Catalogues of cards with movies, where those can be made.
void printMovieFigures(const Options& options);

}  // namespace brivo::bench
