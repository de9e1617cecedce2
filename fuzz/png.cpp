// SPDX-License-Identifier: MIT
#include "platform/images/png.h"

#include "image_check.h"

// What is found of a PNG file lies in it, and few ranges are fetched for it.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  brivo::images::checkReader(brivo::images::readPng, data, size, brivo::images::kForHeadersInARow);
  return 0;
}
