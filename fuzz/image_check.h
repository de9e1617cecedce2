// SPDX-License-Identifier: MIT
// What holds of whatever an image reader finds, and of what it fetches for that.
#pragma once

#include <algorithm>
#include <span>

#include "check.h"
#include "platform/images/parse.h"

namespace brivo::images {

/// Counts what is fetched of a fuzz input.
class CountingSource final : public ByteSource {
 public:
  CountingSource(const std::uint8_t* data, std::size_t size)
      : memory_(std::as_bytes(std::span(data, size))) {}
  std::uint64_t size() const override { return memory_.size(); }
  std::size_t read(std::span<std::byte> buffer, std::uint64_t offset) const override {
    ++ranges_;
    const std::size_t count = memory_.read(buffer, offset);
    bytes_ += count;
    return count;
  }
  /// No more was fetched than `limits` and the first range allow.
  bool keeps(const FetchLimits& limits) const {
    return ranges_ <= limits.ranges + 1 && bytes_ <= limits.bytes + kFirstRange;
  }

 private:
  const MemorySource memory_;
  mutable std::size_t ranges_ = 0;
  mutable std::size_t bytes_ = 0;
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

inline void checkFound(const ImageProperties& found, std::uint64_t size) {
  const auto liesInFile = [size](const EmbeddedImage& image) {
    return image.offset <= size && image.length <= size - image.offset;
  };
  check(found.orientation <= 8);
  check(liesInFile(found.thumbnail));
  check(std::ranges::all_of(found.embedded, liesInFile));
  check(found.entries.packed().size() <= ExifEntries::kMostBytes);
  check(nestedDictionary(found).contains("Orientation") == (found.orientation != 0));
  check(flatDictionary(found).contains("ThumbnailOffset") == static_cast<bool>(found.thumbnail));
}

/// Has `reader` read the input in each scope, twice: what it finds lies in the file and is the same again, it
/// finds nothing in what is not its kind, and it fetches no more than `limits` and the first range allow.
inline void checkReader(bool (*reader)(Parse&), const std::uint8_t* data, std::size_t size,
                        const FetchLimits& limits = kForDirectories) {
  for (const Scope scope : {Scope::basics, Scope::all, Scope::previews}) {
    const CountingSource source(data, size);
    const CountingSource sameSource(data, size);
    Parse parse(source, scope);
    Parse sameParse(sameSource, scope);
    const bool isKnown = reader(parse);
    check(isKnown == reader(sameParse));
    check(isSame(parse.found, sameParse.found));
    check(isKnown || !parse.found);
    checkFound(parse.found, size);
    check(source.keeps(limits));
  }
}

}  // namespace brivo::images
