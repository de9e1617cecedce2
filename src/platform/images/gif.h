// SPDX-License-Identifier: MIT
// GIF files (versions 87a and 89a).
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a GIF: the size of its logical screen. False, with nothing found, for any other file.
bool readGif(Parse& parse);

}  // namespace brivo::images
