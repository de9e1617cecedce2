// SPDX-License-Identifier: MIT
#include "platform/images/jpeg.h"

#include "image_check.h"

// JPEG files with all their segments.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::images::checkReader(brivo::images::readJpegFile, data, size, brivo::images::kForHeadersInARow);
  return 0;
}
