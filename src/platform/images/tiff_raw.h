// SPDX-License-Identifier: MIT
// What raw files in the form of TIFF have of their own. Nothing here is kept; it says what stands there.
#pragma once

#include <span>

#include "platform/images/tiff_block.h"

namespace brivo::images {

/// True for the raw data of a sensor (ISO 12234-2, DNG), false for a picture.
bool isSensorData(const TiffBlock& block, const TiffDirectory& directory);
/// True when the file with these directories is a raw file, not a plain TIFF.
bool isRawFile(const TiffBlock& block, std::span<const TiffDirectory> directories);

/// The image that cameras show of a larger sensor, where the first directory leads to one of the makers' own
/// notes of it: Panasonic's borders, Minolta's block of sizes. Empty when it does not.
PixelSize imageOnSensor(TiffBlock& block, const TiffDirectory& first);
/// Bits of a sample of the image of `directory`, which Panasonic states under a tag of its own; 0 when they
/// are not stated.
std::uint16_t sampleBits(const TiffBlock& block, const TiffDirectory& directory);
/// The size that DNG states for the displayed part of the image of `directory`; empty when it states none.
PixelSize defaultCrop(const TiffBlock& block, const TiffDirectory& directory);
/// The whole JPEG that Panasonic keeps in the first directory, EXIF and all; null when there is none.
const TiffEntry* panasonicJpeg(const TiffBlock& block, const TiffDirectory& first);

}  // namespace brivo::images
