// SPDX-License-Identifier: MIT
// RAF files: a header, a finished JPEG with EXIF, and the raw image behind a list of its properties.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a RAF file; false, with nothing found, for any other.
bool readRaf(Parse& parse);

}  // namespace brivo::images
