// SPDX-License-Identifier: MIT
#include "platform/images/png.h"

#include <algorithm>
#include <optional>
#include <string_view>
#include <vector>

#include "platform/base/byte_cursor.h"
#include "platform/images/chunk.h"
#include "platform/images/exif_chunk.h"
#include "platform/images/inflate.h"

namespace brivo::images {

namespace {

using namespace std::string_view_literals;
constexpr std::string_view kSignature = "\x89PNG\r\n\x1A\n"sv;
constexpr std::string_view kExifProfile = "Raw profile type exif\0"sv;
constexpr std::string_view kApp1Profile = "Raw profile type APP1\0"sv;
/// 64 KiB, which EXIF does not exceed, in hexadecimal digits and lines.
constexpr std::uint64_t kLongestProfile = 147'456;

constexpr std::uint64_t kLengthAndType = 8;
constexpr std::uint64_t kChecksum = 4;

bool isPng(Parse& parse) { return lettersOf(parse.ranges.upTo(0, kSignature.size())) == kSignature; }

/// The chunks of the file up to IEND.
class Chunks {
 public:
  explicit Chunks(Parse& parse) : parse_(parse) {}

  std::optional<Chunk> next() {
    if (!parse_.spendDirectory()) return std::nullopt;
    ByteCursor cursor(parse_.ranges.bytes(next_, kLengthAndType), std::endian::big);
    const std::uint64_t length = cursor.u32();
    const Chunk chunk{lettersOf(cursor.take(4)), next_ + kLengthAndType, length};
    if (!cursor.ok() || chunk.type == "IEND") return std::nullopt;
    next_ = chunk.start + length + kChecksum;
    return chunk;
  }

 private:
  Parse& parse_;
  std::uint64_t next_ = kSignature.size();
};

void readHeader(Parse& parse, const Chunk& chunk) {
  ByteCursor cursor(parse.ranges.bytes(chunk.start, 9), std::endian::big);
  PixelSize size;
  size.width = cursor.u32();
  size.height = cursor.u32();
  const std::uint8_t depth = cursor.u8();
  if (!cursor.ok() || !size) return;
  setOnce(parse.found.size, size);
  setOnce(parse.found.depth, depth);
}

std::optional<unsigned> hexadecimalDigit(char character) {
  if (character >= '0' && character <= '9') return character - '0';
  if (character >= 'a' && character <= 'f') return character - 'a' + 10;
  if (character >= 'A' && character <= 'F') return character - 'A' + 10;
  return std::nullopt;
}

std::vector<std::byte> fromHexadecimal(std::string_view text) {
  std::vector<std::byte> bytes;
  bytes.reserve(text.size() / 2);
  std::optional<unsigned> high;
  for (const char character : text) {
    const auto digit = hexadecimalDigit(character);
    if (!digit) continue;  // line ends
    if (high) bytes.push_back(static_cast<std::byte>(*high << 4 | *digit));
    high = high ? std::nullopt : digit;
  }
  return bytes;
}

/// A profile's digits stand on the lines behind its name and its length, which begin with a line end each.
std::string_view digitsOf(std::string_view profile) {
  for (int line = 0; line < 3; ++line) {
    const std::size_t end = profile.find('\n');
    if (end == std::string_view::npos) return {};
    profile.remove_prefix(end + 1);
  }
  return profile;
}

/// What is decoded has no place in the file, and so its thumbnail has none.
bool readProfile(Parse& parse, std::string_view profile) {
  const auto bytes = fromHexadecimal(digitsOf(profile));
  const MemorySource source(bytes);
  Parse decoded(source, parse.scope);
  decoded.ranges.allow(kForHeadersInARow);
  if (!readExifChunk(decoded, 0, bytes.size())) return false;
  parse.found.entries = std::move(decoded.found.entries);
  setOnce(parse.found.orientation, decoded.found.orientation);
  return true;
}

/// The text behind the keyword of a profile, plain (tEXt) or compressed (zTXt).
bool readText(Parse& parse, const Chunk& chunk) {
  const bool isCompressed = chunk.type == "zTXt";
  if ((chunk.type != "tEXt" && !isCompressed) || chunk.length > kLongestProfile) return false;
  const auto start = lettersOf(parse.ranges.upTo(
      chunk.start, static_cast<std::size_t>(std::min<std::uint64_t>(chunk.length, kExifProfile.size()))));
  if (start != kExifProfile && start != kApp1Profile) return false;
  const auto bytes = parse.ranges.upTo(chunk.start, static_cast<std::size_t>(chunk.length));
  if (bytes.size() <= start.size()) return false;
  const auto content = bytes.subspan(start.size());
  if (!isCompressed) return readProfile(parse, lettersOf(content));
  const auto text =
      inflated(content.subspan(1), kLongestProfile);  // behind the method, which is always zlib's
  return readProfile(parse, lettersOf(text));
}

bool readExifOf(Parse& parse, const Chunk& chunk) {
  if (chunk.type == "eXIf") return readExifChunk(parse, chunk.start, chunk.length);
  return readText(parse, chunk);
}

}  // namespace

bool readPng(Parse& parse) {
  if (!isPng(parse)) return false;
  parse.ranges.allow(kForHeadersInARow);
  Chunks chunks(parse);
  bool hasExif = false;
  while (!hasExif || !parse.found.size) {
    const auto chunk = chunks.next();
    if (!chunk) break;
    if (chunk->type == "IHDR") readHeader(parse, *chunk);
    if (!hasExif) hasExif = readExifOf(parse, *chunk);
  }
  return true;
}

}  // namespace brivo::images
