// SPDX-License-Identifier: MIT
#include "decoder_check.h"

// PNG, TIFF, WebP, GIF, BMP and JPEG 2000 files.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::imaging::checkDecoder(brivo::imaging::decodeWithCodec, data, size);
  return 0;
}
