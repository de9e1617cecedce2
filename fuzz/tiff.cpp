// SPDX-License-Identifier: MIT
#include "platform/images/tiff.h"

#include "image_check.h"

// TIFF, BigTIFF and the raw files that are built like them.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::images::checkReader(brivo::images::readTiffFile, data, size);
  return 0;
}
