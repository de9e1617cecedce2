// SPDX-License-Identifier: MIT
#pragma once

#include "options.h"

namespace brivo::bench {

/// Previews that lie in raw files.
void printRawPreviewFigures(const Options& options);

}  // namespace brivo::bench
