// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "support/image_bytes.h"

namespace brivo::test {

/// EXIF with a camera, an orientation and a thumbnail of 160 × 120.
inline std::string exifWithThumbnail(std::endian order, unsigned orientation = 6) {
  TiffBytes tiff(order);
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  tiff.shorts(0x0112, {orientation});
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.ascii(0x9003, "2021:06:01 10:00:00");
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  return tiff.build();
}

}  // namespace brivo::test
