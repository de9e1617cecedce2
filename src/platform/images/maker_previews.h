// SPDX-License-Identifier: MIT
// Previews that maker notes name (EXIF 2.32 tag 0x927C), which each maker lays out in its own way.
#pragma once

#include <cstdint>
#include <string_view>

#include "platform/images/parse.h"

namespace brivo::images {

/// Where a maker note lies.
struct MakerNote {
  std::uint64_t start = 0;      ///< bytes from the start of the file
  std::uint64_t length = 0;     ///< bytes
  std::uint64_t exifStart = 0;  ///< what the offsets of the EXIF block that holds it count from
  std::string_view make;        ///< as the camera states it; many notes do not say whose they are
};

/// Adds the finished JPEGs that a maker note holds or names to the embedded images.
void readMakerPreviews(Parse& parse, const MakerNote& note);

/// The same for a maker note that was moved into the private data of a DNG file (Adobe DNG 1.7, tag 0xC634),
/// at `start` in the file; its offsets count from where it once was.
void readMovedMakerPreviews(Parse& parse, std::uint64_t start, std::uint64_t length, std::string_view make);

}  // namespace brivo::images
