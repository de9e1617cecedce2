// SPDX-License-Identifier: MIT
#include "decoder_check.h"

// Camera raw files.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::imaging::checkDecoder(brivo::imaging::decodeRaw, data, size);
  return 0;
}
