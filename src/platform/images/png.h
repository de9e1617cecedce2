// SPDX-License-Identifier: MIT
// PNG files (ISO/IEC 15948, with the eXIf chunk of its extensions).
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a PNG: size and depth from its header, EXIF from its eXIf chunk or from a raw profile in an
/// uncompressed text chunk. Compressed profiles are left out. False, with nothing found, for any other file.
bool readPng(Parse& parse);

}  // namespace brivo::images
