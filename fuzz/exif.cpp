// SPDX-License-Identifier: MIT
#include <string>

#include "image_check.h"
#include "platform/images/jpeg.h"

// The input is the EXIF block of a JPEG, maker note and all.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  using namespace std::string_literals;
  constexpr std::size_t kBesideBlock = 8;
  const std::string_view block = textOf(data, size).substr(0, 0xFFFF - kBesideBlock);
  const std::size_t length = block.size() + kBesideBlock;
  const std::string file = "\xFF\xD8\xFF\xE1"s + static_cast<char>(length >> 8) +
                           static_cast<char>(length & 0xFF) + "Exif\0\0"s + std::string(block) +
                           "\xFF\xC0\0\x11\x08\0\x14\0\x0A\3\1\x11\0\2\x11\0\3\x11\0"s;
  brivo::images::checkReader(brivo::images::readJpegFile, std::as_bytes(std::span(file)),
                             brivo::images::kForHeadersInARow);
  return 0;
}
