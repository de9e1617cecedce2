// SPDX-License-Identifier: MIT
// The finished JPEG in a raw file that carries the photo's EXIF.
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads the EXIF of the JPEG in bytes `offset` to `offset` + `length`, but not its size and depth, which are
/// not those of the raw image. In search of previews the JPEG is an embedded image, as its EXIF thumbnail is;
/// the JPEG's size is `stated` if its frame header does not give one. No JPEG, or one that leaves the file,
/// gives nothing.
void readRawPreview(Parse& parse, std::uint64_t offset, std::uint64_t length, PixelSize stated = {});

}  // namespace brivo::images
