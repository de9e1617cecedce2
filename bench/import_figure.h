// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Prints what importing a card with brivoctl takes, against copying and syncing it, and what it takes with
/// verification. Throws when this build's brivoctl cannot import, or does not import all.
void printImportFigure(const Options& options);

}  // namespace brivo::bench
