// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Prints how much memory the service needs to have files streamed: a small and a very large one, and ten by
/// as many clients.
void printMemoryFigures(const Options& options);

}  // namespace brivo::bench
