// SPDX-License-Identifier: MIT
// EXIF as chunks of containers carry it: a TIFF block, with or without the signature of JPEG's segment.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads the EXIF in bytes `start` to `start` + `length`; false, with nothing found, when there is no TIFF
/// block.
bool readExifChunk(Parse& parse, std::uint64_t start, std::uint64_t length);

}  // namespace brivo::images
