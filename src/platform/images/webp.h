// SPDX-License-Identifier: MIT
// WebP files (RFC 9649).
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a WebP file: its size from the canvas or the frame header, and EXIF. False, with nothing found, for
/// any other file.
bool readWebp(Parse& parse);

}  // namespace brivo::images
