// SPDX-License-Identifier: MIT
// Icon files: several images of one motif, a PNG file or a device-independent bitmap each (the ICO format).
#pragma once

#include <optional>
#include <vector>

#include "imaging/picture.h"
#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// The width in pixels of each image; empty when the bytes are no icon file.
std::vector<std::uint32_t> iconWidths(const images::ByteSource& source);
/// One image. None when there is no such one or it is broken.
std::optional<Picture> decodeIcon(const images::ByteSource& source, std::uint32_t index);

}  // namespace brivo::imaging
