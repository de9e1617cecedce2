// SPDX-License-Identifier: MIT
#include "imaging/icon_file.h"

#include <algorithm>
#include <array>
#include <span>

#include "imaging/codec.h"
#include "platform/base/byte_cursor.h"

namespace brivo::imaging {

namespace {

constexpr std::size_t kHeaderBytes = 6;
constexpr std::size_t kEntryBytes = 16;
constexpr std::uint16_t kMostImages = 256;
constexpr std::uint32_t kLongestImage = 16 << 20;

struct Entry {
  std::uint32_t width = 0;
  std::uint32_t length = 0;
  std::uint32_t offset = 0;
};

std::vector<Entry> entriesOf(const images::ByteSource& source) {
  std::array<std::byte, kHeaderBytes + kEntryBytes * kMostImages> start{};
  const std::size_t count = source.read(start, 0);
  ByteCursor cursor{std::span<const std::byte>(start).first(count)};
  constexpr std::uint16_t kIcon = 1;
  std::vector<Entry> entries;
  if (cursor.u16() != 0 || cursor.u16() != kIcon) return entries;
  for (std::uint16_t left = std::min(cursor.u16(), kMostImages); left > 0; --left) {
    Entry entry;
    const std::uint8_t width = cursor.u8();
    entry.width = width == 0 ? 256 : width;
    cursor.skip(7);  // height, colours, reserved, planes, bits
    entry.length = cursor.u32();
    entry.offset = cursor.u32();
    if (!cursor.ok()) break;
    entries.push_back(entry);
  }
  return entries;
}

std::vector<std::byte> bytesOf(const images::ByteSource& source, const Entry& entry) {
  const bool inside = entry.offset <= source.size() && entry.length <= source.size() - entry.offset;
  if (!inside || entry.length > kLongestImage) return {};
  std::vector<std::byte> bytes(entry.length);
  bytes.resize(source.read(bytes, entry.offset));
  return bytes;
}

void append(std::vector<std::byte>& bytes, std::uint32_t number, int width) {
  for (int i = 0; i < width; ++i) bytes.push_back(static_cast<std::byte>(number >> 8 * i & 0xFF));
}

/// The bitmap of an icon as a BMP file: with a file header in front, and its height, which counts a mask of
/// the same height that follows the pixels, halved. Empty when it is too short.
std::vector<std::byte> bitmapFile(std::span<const std::byte> bitmap) {
  constexpr std::uint32_t kFileHeader = 14;
  constexpr std::size_t kHeightAt = 8;
  ByteCursor cursor(bitmap);
  const std::uint32_t header = cursor.u32();
  cursor.seek(kHeightAt);
  const std::uint32_t height = cursor.u32();
  cursor.skip(2);
  const std::uint32_t bits = cursor.u16();
  cursor.skip(16);  // compression, bytes, pixels per metre both ways
  const std::uint32_t stated = cursor.u32();
  if (!cursor.ok()) return {};
  const std::uint32_t colours = stated == 0 && bits <= 8 ? 1U << bits : stated;
  std::vector<std::byte> file{std::byte{'B'}, std::byte{'M'}};
  append(file, static_cast<std::uint32_t>(bitmap.size()) + kFileHeader, 4);
  append(file, 0, 4);
  append(file, kFileHeader + header + 4 * colours, 4);
  file.insert(file.end(), bitmap.begin(), bitmap.begin() + kHeightAt);
  append(file, height / 2, 4);
  file.insert(file.end(), bitmap.begin() + kHeightAt + 4, bitmap.end());
  return file;
}

bool isPng(std::span<const std::byte> bytes) {
  return ByteCursor(bytes, std::endian::big).u32() == 0x89504E47;
}

}  // namespace

std::vector<std::uint32_t> iconWidths(const images::ByteSource& source) {
  std::vector<std::uint32_t> widths;
  for (const Entry& entry : entriesOf(source)) widths.push_back(entry.width);
  return widths;
}

std::optional<Picture> decodeIcon(const images::ByteSource& source, std::uint32_t index) {
  const std::vector<Entry> entries = entriesOf(source);
  if (index >= entries.size()) return std::nullopt;
  const std::vector<std::byte> bytes = bytesOf(source, entries[index]);
  const Packet packet = packetOf(isPng(bytes) ? bytes : bitmapFile(bytes));
  auto codec = Codec::open(isPng(bytes) ? AV_CODEC_ID_PNG : AV_CODEC_ID_BMP);
  Frame frame = packet && codec ? codec->decode(*packet) : nullptr;
  return frame ? std::optional(Picture{std::move(frame), {}}) : std::nullopt;
}

}  // namespace brivo::imaging
