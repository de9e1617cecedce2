// SPDX-License-Identifier: MIT
// BMP files of Windows and OS/2.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a BMP: its size and depth. False, with nothing found, for any other file.
bool readBmp(Parse& parse);

}  // namespace brivo::images
