// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <optional>

#include "platform/images/byte_source.h"
#include "platform/movies/movie_description.h"

namespace brivo::imaging {

/// A visual sample entry (ISO/IEC 14496-12 section 12.1.3).
struct SampleEntry {
  bool encrypted = false;  ///< by ISO/IEC 23001-7 or another scheme
  VideoFormatDescription format;
};

/// The first one of the track with this id, as far as the file says it. None when there is none, or the file
/// is no ISO base media or QuickTime file. Pure but for memory, and bounded.
std::optional<SampleEntry> firstSampleEntry(const images::ByteSource& source, std::uint32_t trackId);

}  // namespace brivo::imaging
