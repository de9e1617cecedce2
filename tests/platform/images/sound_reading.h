// SPDX-License-Identifier: MIT
// What holds of whatever is read, however hostile the bytes are.
#pragma once

#include <gtest/gtest.h>

#include "platform/images/parse.h"
#include "platform/images/ranges.h"
#include "reading.h"

namespace brivo::images {

inline bool liesIn(const EmbeddedImage& image, std::size_t size) {
  return image.offset <= size && image.length <= size - image.offset;
}

/// Reads `file` in each way there is: all that is found lies in the file, and no more than `limits` and the
/// first range is fetched.
inline void expectSound(const std::string& file, const FetchLimits& limits = kForDirectories) {
  for (const auto copy : {copySequentialProperties, copyImageProperties, copyContainerProperties}) {
    const CountingSource source(file);
    const auto found = copy(source);
    EXPECT_LE(source.reads(), limits.ranges + 1);
    EXPECT_LE(source.bytesRead(), limits.bytes + kFirstRange);
    if (!found) continue;
    EXPECT_LE(found->orientation, 8);
    EXPECT_TRUE(liesIn(found->thumbnail, file.size()));
    for (const EmbeddedImage& image : found->embedded) EXPECT_TRUE(liesIn(image, file.size()));
  }
}

/// The same for what is left of `file` when it ends early, at every length.
inline void expectCutsSound(const std::string& file, const FetchLimits& limits = kForDirectories) {
  for (std::size_t length = 0; length < file.size(); ++length) {
    SCOPED_TRACE(length);
    expectSound(file.substr(0, length), limits);
  }
}

/// The same with four bytes of all ones, which make counts and offsets as big as they get, at every place.
inline void expectHugeNumbersSound(const std::string& file, const FetchLimits& limits = kForDirectories) {
  for (std::size_t place = 0; place + 4 <= file.size(); ++place) {
    SCOPED_TRACE(place);
    expectSound(std::string(file).replace(place, 4, 4, '\xFF'), limits);
  }
}

}  // namespace brivo::images
