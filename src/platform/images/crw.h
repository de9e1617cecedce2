// SPDX-License-Identifier: MIT
// CRW files (CIFF, Camera Image File Format 1.0): heaps in heaps, each with its directory at its end.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a CRW file; false, with nothing found, for any other.
bool readCrw(Parse& parse);

}  // namespace brivo::images
