// SPDX-License-Identifier: MIT
// JPEG files (ITU-T T.81; JFIF; EXIF 2.32; CIPA DC-007 multi-picture format).
#pragma once

#include "platform/images/parse.h"

namespace brivo::images {

/// Reads a file that is a JPEG; false, with nothing found, for any other.
bool readJpegFile(Parse& parse);

/// What the JPEG in bytes `start` to `start` + `length` says: size and depth from its frame header, EXIF, and
/// in search of previews the other pictures of a multi-picture file.
void readJpeg(Parse& parse, std::uint64_t start, std::uint64_t length);

/// The JPEG that lies in `length` bytes from `offset` on, with the size from its frame header if that can be
/// read; empty when the range is not in the file, does not begin as a JPEG, or is no picture that every
/// viewer shows (8 bits of one or three components, Huffman-coded and lossy): raw files keep their sensor
/// data so.
EmbeddedImage jpegAt(Parse& parse, std::uint64_t offset, std::uint64_t length);

/// Adds jpegAt() to the embedded images, if it is one and none that begins there is listed yet. A size that
/// its frame header does not give is `stated`; `orientation` is EXIF's, 0 when it is not stated.
void addEmbeddedJpeg(Parse& parse, std::uint64_t offset, std::uint64_t length, PixelSize stated = {},
                     std::uint16_t orientation = 0);

}  // namespace brivo::images
