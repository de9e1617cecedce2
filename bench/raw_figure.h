// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// The facts of a raw file of 50 MB with four JPEGs in it, read by the image reader in this process, against
/// dcraw.
void printRawFigure(const Options& options);

}  // namespace brivo::bench
