// SPDX-License-Identifier: MIT
#include "image_check.h"
#include "platform/images/bmp.h"
#include "platform/images/gif.h"

// GIF and BMP headers lie in the first range, and say nothing but a size.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  for (const auto reader : {brivo::images::readGif, brivo::images::readBmp})
    brivo::images::checkReader(reader, data, size, {0, 0, 0});
  return 0;
}
