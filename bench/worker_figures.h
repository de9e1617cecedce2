// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// What it costs that a worker decodes.
void printWorkerFigures(const Options& options);

}  // namespace brivo::bench
