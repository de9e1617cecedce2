// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>

#include "platform/images/byte_source.h"
#include "platform/movies/movie_description.h"

namespace brivo::imaging {

/// A visual sample entry (ISO/IEC 14496-12 section 12.1.3).
struct SampleEntry {
  bool encrypted = false;  ///< by ISO/IEC 23001-7 or another scheme
  VideoFormatDescription format;
};

/// By the id of their track.
using SampleEntries = std::map<std::uint32_t, SampleEntry>;

/// The first one of each track of an ISO base media or QuickTime file that has one, as far as the file says
/// it. Reads 1 MiB at most. Pure but for memory.
SampleEntries firstSampleEntries(const images::ByteSource& source);

}  // namespace brivo::imaging
