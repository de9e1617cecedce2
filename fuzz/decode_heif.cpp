// SPDX-License-Identifier: MIT
#include "decoder_check.h"

// HEIF files.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::imaging::checkDecoder(brivo::imaging::decodeHeif, data, size);
  return 0;
}
