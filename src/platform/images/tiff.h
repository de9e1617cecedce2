// SPDX-License-Identifier: MIT
// TIFF files (Adobe TIFF 6.0, BigTIFF, Adobe DNG 1.7, ISO 12234-2) and the raw files that are built like
// them.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a file that begins as TIFF, or as a raw file that deviates from it in its magic number alone; false,
/// with nothing found, for any other.
///
/// The image of the first directory is the file's image, unless that directory states a reduced version: then
/// it is the largest full one of the other directories.
bool readTiffFile(Parse& parse);

}  // namespace brivo::images
