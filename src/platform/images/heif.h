// SPDX-License-Identifier: MIT
// HEIF (ISO/IEC 23008-12) with all its kinds: HEIC, MIAF, AVIF.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// True when one of the brands of a file is that of a HEIF.
bool isHeif(Parse& parse);

/// Reads a file that is a HEIF; false, with nothing found, for any other. The orientation is the one that the
/// properties of the picture make, since EXIF does not count there; of a file with nothing but a sequence of
/// pictures the size is found.
bool readHeifFile(Parse& parse);

}  // namespace brivo::images
