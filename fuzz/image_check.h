// SPDX-License-Identifier: MIT
// What holds of whatever an image reader finds, and of what it fetches for that.
#pragma once

#include <algorithm>
#include <array>
#include <cstring>
#include <span>
#include <vector>

#include "check.h"
#include "platform/images/parse.h"

namespace brivo::images {

/// A file that repeats the fuzz input up to its size, and counts what is fetched of it.
class FuzzSource final : public ByteSource {
 public:
  FuzzSource(std::span<const std::byte> bytes, std::uint64_t size) : size_(size) {
    constexpr std::size_t kEnoughAtOnce = 65'536;
    while (!bytes.empty() && repeated_.size() < std::min<std::uint64_t>(size, kEnoughAtOnce))
      repeated_.insert(repeated_.end(), bytes.begin(), bytes.end());
  }
  std::uint64_t size() const override { return size_; }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++reads_;
    bytesRead_ += buffer.size();
    const std::uint64_t rest = offset < size_ ? size_ - offset : 0;
    const auto count = static_cast<std::size_t>(std::min<std::uint64_t>(buffer.size(), rest));
    for (std::size_t done = 0; done < count;) {
      const auto place = static_cast<std::size_t>((offset + done) % repeated_.size());
      const std::size_t length = std::min(repeated_.size() - place, count - done);
      std::memcpy(buffer.data() + done, repeated_.data() + place, length);
      done += length;
    }
    return count;
  }
  std::size_t reads() const { return reads_; }
  std::size_t bytesRead() const { return bytesRead_; }

 private:
  std::vector<std::byte> repeated_;  ///< the input, once or more often
  const std::uint64_t size_;
  mutable std::size_t reads_ = 0;
  mutable std::size_t bytesRead_ = 0;
};

inline bool isSame(const EmbeddedImage& a, const EmbeddedImage& b) {
  return a.offset == b.offset && a.length == b.length && a.size == b.size && a.orientation == b.orientation;
}

inline bool isSame(const ImageProperties& a, const ImageProperties& b) {
  return a.size == b.size && a.depth == b.depth && a.orientation == b.orientation && a.crop == b.crop &&
         isSame(a.thumbnail, b.thumbnail) && std::ranges::equal(a.entries.packed(), b.entries.packed()) &&
         std::ranges::equal(a.embedded, b.embedded,
                            [](const auto& one, const auto& other) { return isSame(one, other); });
}

inline void checkEmbedded(const EmbeddedImage& image, const ByteSource& source) {
  std::array<std::byte, 2> start{};
  check(image.offset <= source.size() && image.length <= source.size() - image.offset);
  check(source.read(start, image.offset) == start.size());
  check(start[0] == std::byte{0xFF} && start[1] == std::byte{0xD8});
}

inline void checkFound(const ImageProperties& found, const ByteSource& source) {
  check(found.orientation <= 8);
  check(found.entries.packed().size() <= ExifEntries::kMostBytes);
  if (found.thumbnail) checkEmbedded(found.thumbnail, source);
  for (const EmbeddedImage& image : found.embedded) checkEmbedded(image, source);
  check(nestedDictionary(found).contains("Orientation") == (found.orientation != 0));
  check(flatDictionary(found).contains("ThumbnailOffset") == static_cast<bool>(found.thumbnail));
}

using Reader = bool (*)(Parse&);

/// Has `reader` read a file twice: what it finds lies in the file and is the same again, it finds nothing in
/// what is not its kind, and it fetches no more than `limits` and the first range allow.
inline void checkReading(Reader reader, const FuzzSource& source, Scope scope, const FetchLimits& limits) {
  const std::size_t reads = source.reads();
  const std::size_t bytesRead = source.bytesRead();
  Parse parse(source, scope);
  const bool isKnown = reader(parse);
  check(source.reads() - reads <= limits.ranges + 1);
  check(source.bytesRead() - bytesRead <= limits.bytes + kFirstRange);
  check(isKnown || !parse.found);
  checkFound(parse.found, source);
  Parse again(source, scope);
  check(isKnown == reader(again));
  check(isSame(parse.found, again.found));
}

/// Reads the input in each scope: as it is, and again and again in a file so large that the limits count.
inline void checkReader(Reader reader, std::span<const std::byte> bytes,
                        const FetchLimits& limits = kForDirectories) {
  constexpr std::uint64_t kLarge = 16 * 1024 * 1024;
  for (const std::uint64_t size : {std::uint64_t{bytes.size()}, bytes.empty() ? 0 : kLarge}) {
    const FuzzSource source(bytes, size);
    for (const Scope scope : {Scope::basics, Scope::all, Scope::previews})
      checkReading(reader, source, scope, limits);
  }
}

/// The same for a fuzz input.
inline void checkReader(Reader reader, const std::uint8_t* data, std::size_t size,
                        const FetchLimits& limits = kForDirectories) {
  checkReader(reader, std::as_bytes(std::span(data, size)), limits);
}

}  // namespace brivo::images
