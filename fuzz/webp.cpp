// SPDX-License-Identifier: MIT
#include "platform/images/webp.h"

#include "image_check.h"

// What is found of a WebP file lies in it, and few ranges are fetched for it.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::images::checkReader(brivo::images::readWebp, data, size);
  return 0;
}
