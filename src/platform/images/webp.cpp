// SPDX-License-Identifier: MIT
#include "platform/images/webp.h"

#include <optional>
#include <string_view>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/exif_chunk.h"

namespace brivo::images {

namespace {

constexpr std::uint64_t kFileHeader = 12;
constexpr std::uint64_t kChunkHeader = 8;
constexpr std::uint16_t kDepth = 8;  // RFC 9649 knows no other
constexpr std::uint32_t kFourteenBits = 0x3FFF;

bool isWebp(Parse& parse) {
  const auto header = lettersOf(parse.ranges.upTo(0, kFileHeader));
  return header.starts_with("RIFF") && header.ends_with("WEBP") && header.size() == kFileHeader;
}

/// The chunks of the file. They begin at even places.
class Chunks {
 public:
  explicit Chunks(Parse& parse) : parse_(parse) {}

  std::optional<Chunk> next() {
    if (!parse_.spendDirectory()) return std::nullopt;
    ByteCursor cursor(parse_.ranges.bytes(next_, kChunkHeader));
    const std::string_view type = lettersOf(cursor.take(4));
    const std::uint64_t length = cursor.u32();
    if (!cursor.ok()) return std::nullopt;
    const Chunk chunk{type, next_ + kChunkHeader, length};
    next_ = chunk.start + length + length % 2;
    return chunk;
  }

 private:
  Parse& parse_;
  std::uint64_t next_ = kFileHeader;
};

std::uint32_t u24(ByteCursor& cursor) {
  const std::uint32_t low = cursor.u16();
  return low | std::uint32_t{cursor.u8()} << 16;
}

PixelSize canvasOf(ByteCursor cursor) {
  cursor.skip(4);  // flags
  PixelSize size;
  size.width = u24(cursor) + 1;
  size.height = u24(cursor) + 1;
  return cursor.ok() ? size : PixelSize();
}

/// RFC 6386 9.1: a start code, and the two upper bits of each number are a scale.
PixelSize lossySizeOf(ByteCursor cursor) {
  cursor.skip(3);  // frame tag
  const std::uint32_t startCode = u24(cursor);
  PixelSize size;
  size.width = cursor.u16() & kFourteenBits;
  size.height = cursor.u16() & kFourteenBits;
  return cursor.ok() && startCode == 0x2A019D ? size : PixelSize();
}

PixelSize losslessSizeOf(ByteCursor cursor) {
  const bool hasSignature = cursor.u8() == 0x2F;
  const std::uint32_t bits = cursor.u32();
  const PixelSize size{(bits & kFourteenBits) + 1, (bits >> 14 & kFourteenBits) + 1};
  return cursor.ok() && hasSignature ? size : PixelSize();
}

PixelSize sizeIn(Parse& parse, const Chunk& chunk) {
  if (chunk.type != "VP8X" && chunk.type != "VP8 " && chunk.type != "VP8L") return {};
  constexpr std::size_t kMostBytes = 10;
  const ByteCursor cursor(parse.ranges.upTo(chunk.start, kMostBytes));
  if (chunk.type == "VP8X") return canvasOf(cursor);
  return chunk.type == "VP8 " ? lossySizeOf(cursor) : losslessSizeOf(cursor);
}

}  // namespace

bool readWebp(Parse& parse) {
  if (!isWebp(parse)) return false;
  parse.ranges.allow(kForDirectories);
  Chunks chunks(parse);
  bool hasExif = false;
  while (!hasExif || !parse.found.size) {
    const auto chunk = chunks.next();
    if (!chunk) break;
    setOnce(parse.found.size, sizeIn(parse, *chunk));
    if (chunk->type == "EXIF" && !hasExif) hasExif = readExifChunk(parse, chunk->start, chunk->length);
  }
  if (parse.found.size) parse.found.depth = kDepth;
  return true;
}

}  // namespace brivo::images
