// SPDX-License-Identifier: MIT
#include "platform/images/gif.h"

#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"

namespace brivo::images {

namespace {

constexpr std::size_t kSignature = 6;
constexpr std::size_t kHeader = kSignature + 4;
constexpr std::uint16_t kDepth = 8;  // of the colours in its tables

}  // namespace

bool readGif(Parse& parse) {
  ByteCursor cursor(parse.ranges.upTo(0, kHeader));
  const std::string_view signature = lettersOf(cursor.take(kSignature));
  if (signature != "GIF87a" && signature != "GIF89a") return false;
  PixelSize size;
  size.width = cursor.u16();
  size.height = cursor.u16();
  if (!cursor.ok() || !size) return true;
  parse.found.size = size;
  parse.found.depth = kDepth;
  return true;
}

}  // namespace brivo::images
