// SPDX-License-Identifier: MIT
// MRW files: blocks in a row before the raw image, one of them a TIFF block with EXIF.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads an MRW file; false, with nothing found, for any other.
bool readMrw(Parse& parse);

}  // namespace brivo::images
