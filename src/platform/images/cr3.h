// SPDX-License-Identifier: MIT
// Canon's CR3: ISO base media boxes (ISO/IEC 14496-12) with boxes of the maker's own around TIFF blocks.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a file that is a CR3; false, with nothing found, for any other.
bool readCr3File(Parse& parse);

}  // namespace brivo::images
