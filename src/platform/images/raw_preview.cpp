// SPDX-License-Identifier: MIT
#include "platform/images/raw_preview.h"

#include "platform/images/jpeg.h"

namespace brivo::images {

void readRawPreview(Parse& parse, std::uint64_t offset, std::uint64_t length, PixelSize stated) {
  const std::uint64_t fileSize = parse.ranges.size();
  if (offset > fileSize || length > fileSize - offset) return;
  const PixelSize size = parse.found.size;
  const std::uint16_t depth = parse.found.depth;
  readJpeg(parse, offset, length);
  parse.found.size = size;
  parse.found.depth = depth;
  if (parse.scope == Scope::previews) addEmbeddedJpeg(parse, offset, length, stated);
}

}  // namespace brivo::images
