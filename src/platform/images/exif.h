// SPDX-License-Identifier: MIT
// EXIF (CIPA DC-008 / JEITA CP-3451, EXIF 2.32) in a TIFF block. All of it adds to what a parse has found,
// and leaves out what is bad.
#pragma once

#include "platform/images/tiff_block.h"

namespace brivo::images {

/// Tags of TIFF and EXIF that say how a file is laid out.
namespace tag {
inline constexpr std::uint16_t kNewSubfileType = 0x00FE;
inline constexpr std::uint16_t kImageWidth = 0x0100;
inline constexpr std::uint16_t kImageLength = 0x0101;
inline constexpr std::uint16_t kBitsPerSample = 0x0102;
inline constexpr std::uint16_t kCompression = 0x0103;
inline constexpr std::uint16_t kPhotometricInterpretation = 0x0106;
inline constexpr std::uint16_t kMake = 0x010F;
inline constexpr std::uint16_t kStripOffsets = 0x0111;
inline constexpr std::uint16_t kOrientation = 0x0112;
inline constexpr std::uint16_t kStripByteCounts = 0x0117;
inline constexpr std::uint16_t kSubDirectories = 0x014A;
inline constexpr std::uint16_t kJpegOffset = 0x0201;
inline constexpr std::uint16_t kJpegLength = 0x0202;
inline constexpr std::uint16_t kExifDirectory = 0x8769;
inline constexpr std::uint16_t kGpsDirectory = 0x8825;
inline constexpr std::uint16_t kMakerNote = 0x927C;
}  // namespace tag

/// The whole of an EXIF block: its first directory, the EXIF and GPS directories that it names, and the
/// thumbnail in the directory behind it; in search of previews those of the maker note instead of entries.
void readExif(TiffBlock& block);

/// What the first directory of an EXIF block says: TIFF entries, EXIF entries where they stand here (ISO
/// 12234-2), orientation, and what the EXIF and GPS directories hold that it names.
void readMainDirectory(TiffBlock& block, const TiffDirectory& directory);
/// The entries of an EXIF directory and of its maker note.
void readExifDirectory(TiffBlock& block, const TiffDirectory& directory);
/// The entries of a GPS directory.
void readGpsDirectory(TiffBlock& block, const TiffDirectory& directory);
/// Keeps the JPEG that `directory` names (tags 0x0201 and 0x0202) as the thumbnail, if there is one there; in
/// search of previews it is one of them too.
void readThumbnail(TiffBlock& block, const TiffDirectory& directory);

/// Adds the previews of the maker note, which the EXIF directory names that `main` names, to the embedded
/// images.
void readMakerPreviews(TiffBlock& block, const TiffDirectory& main);
/// The size that a directory states for its image.
PixelSize statedSize(const TiffBlock& block, const TiffDirectory& directory);
/// Adds the JPEG whose offset and length `directory` has under these tags to the embedded images, with the
/// size and the orientation that it states.
void addNamedJpeg(const TiffBlock& block, const TiffDirectory& directory, std::uint16_t offsetTag,
                  std::uint16_t lengthTag);

/// Keeps the entries of a maker note that is a directory by itself: an ASCII signature that a NUL ends,
/// padding, the version 00 01, a byte-order mark, and a TIFF directory whose offsets count from the start of
/// the note. Any other note gives none.
void readMakerNoteDictionary(Parse& parse, std::uint64_t start, std::uint64_t length);

}  // namespace brivo::images
