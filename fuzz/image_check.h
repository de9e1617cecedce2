// SPDX-License-Identifier: MIT
#pragma once

#include <algorithm>
#include <optional>
#include <span>

#include "check.h"
#include "platform/images/image_reader.h"

namespace brivo::images {

/// An image in memory that counts what is fetched of it.
class CountingSource final : public ByteSource {
 public:
  CountingSource(const std::uint8_t* data, std::size_t size)
      : memory_(std::as_bytes(std::span(data, size))) {}
  std::uint64_t size() const override { return memory_.size(); }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++ranges_;
    bytes_ += buffer.size();
    return memory_.read(buffer, offset);
  }
  std::size_t ranges() const { return ranges_; }
  std::size_t bytes() const { return bytes_; }

 private:
  const MemorySource memory_;
  mutable std::size_t ranges_ = 0;
  mutable std::size_t bytes_ = 0;
};

using ImageReader = std::optional<ImageProperties> (*)(const ByteSource&);

inline void checkLiesWithin(const EmbeddedImage& image, std::uint64_t size) {
  check(image.offset <= size && image.length <= size - image.offset);
  check(image.orientation <= 8);
}

inline void checkSame(const ImageProperties& first, const ImageProperties& second) {
  check(first.size == second.size && first.crop == second.crop);
  check(first.depth == second.depth && first.orientation == second.orientation);
  check(std::ranges::equal(first.entries.packed(), second.entries.packed()));
  check(first.thumbnail.offset == second.thumbnail.offset);
  check(first.thumbnail.length == second.thumbnail.length);
  check(std::ranges::equal(first.embedded, second.embedded, {}, &EmbeddedImage::offset,
                           &EmbeddedImage::offset));
}

/// Most that a parse may fetch: formats whose headers lie in a row have shorter ranges, and more of them.
inline bool isModest(const CountingSource& source, bool headersInARow) {
  const std::size_t ranges = headersInARow ? 65 : 5;
  const std::size_t bytes = headersInARow ? std::size_t{528} * 1024 : std::size_t{256} * 1024;
  return source.ranges() <= ranges && source.bytes() <= bytes;
}

/// True for what begins as a JPEG or a PNG.
inline bool hasHeadersInARow(const std::uint8_t* data, std::size_t size) {
  return size != 0 && (data[0] == 0xFF || data[0] == 0x89);
}

/// What holds of one call: little is fetched, pictures lie in the file, and a second reading gives the same.
inline void checkReader(ImageReader reader, const std::uint8_t* data, std::size_t size) {
  const CountingSource source(data, size);
  const auto found = reader(source);
  check(isModest(source, hasHeadersInARow(data, size)));
  const auto again = reader(CountingSource(data, size));
  check(found.has_value() == again.has_value());
  if (!found) return;
  check(found->orientation <= 8);
  checkLiesWithin(found->thumbnail, size);
  for (const EmbeddedImage& image : found->embedded) checkLiesWithin(image, size);
  checkSame(*found, *again);
}

/// The same of all calls, and dictionaries say what was found.
inline void checkImage(const std::uint8_t* data, std::size_t size) {
  for (const ImageReader reader : {copySequentialProperties, copyImageProperties, copyContainerProperties})
    checkReader(reader, data, size);
  const auto found = copyImageProperties(CountingSource(data, size));
  if (!found) return;
  check(nestedDictionary(*found).contains("Orientation") == (found->orientation != 0));
  check(flatDictionary(*found).contains("ThumbnailOffset") == static_cast<bool>(found->thumbnail));
}

}  // namespace brivo::images
