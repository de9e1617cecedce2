// SPDX-License-Identifier: MIT
// The pictures of a HEIF that are rare enough to be left to libheif.
#pragma once

#include <cstdint>
#include <optional>

#include "imaging/picture.h"
#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// The primary picture of a HEIF as 8-bit RGB, neither turned nor cropped, or that one of its thumbnails
/// which has the identifier `thumbnail`. None when libheif cannot decode it or it is beyond the limits.
std::optional<Picture> decodeWithLibheif(const images::ByteSource& source,
                                         std::optional<std::uint32_t> thumbnail = std::nullopt);

}  // namespace brivo::imaging
