// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <map>
#include <nlohmann/json.hpp>
#include <string>
#include <string_view>
#include <vector>

#include "platform/images/image_properties.h"

namespace brivo::images {

/// An embedded JPEG as two programs can both tell of it.
struct Preview {
  std::uint64_t length;
  PixelSize size;  ///< 0 × 0 when it is not told
};

/// What a program says of a file, in a form in which two can be compared.
struct Facts {
  std::vector<PixelSize> sizes;  ///< of the picture; each is a right answer
  std::map<std::string, std::string>
      texts;  ///< orientation, dates, camera, thumbnail: what is said, if it is
  std::multimap<std::uint64_t, Preview> previews;  ///< by offset
  std::uint64_t thumbnailOffset = 0;
};

/// `all` and `previews` are what the full call and the container call have given.
Facts factsOf(const ImageProperties& all, const ImageProperties& previews);

/// The facts of expected.json on a file. `isShownByItems` says that its item properties state how it is
/// turned, as in HEIF, and EXIF is only a note.
Facts factsOf(const nlohmann::json& expected, bool isShownByItems);

std::string textOf(PixelSize size);

}  // namespace brivo::images
