// SPDX-License-Identifier: MIT
#include "platform/images/exif_chunk.h"

#include <string_view>

#include "platform/images/chunk.h"
#include "platform/images/exif.h"

namespace brivo::images {

namespace {

using namespace std::string_view_literals;
constexpr std::string_view kSignature = "Exif\0\0"sv;

bool hasSignature(Parse& parse, std::uint64_t start, std::uint64_t length) {
  if (length < kSignature.size()) return false;
  return lettersOf(parse.ranges.bytes(start, kSignature.size())) == kSignature;
}

}  // namespace

bool readExifChunk(Parse& parse, std::uint64_t start, std::uint64_t length) {
  const std::uint64_t before = hasSignature(parse, start, length) ? kSignature.size() : 0;
  auto block = TiffBlock::at(parse, start + before, length - before);
  if (!block) return false;
  readExif(*block);
  return true;
}

}  // namespace brivo::images
