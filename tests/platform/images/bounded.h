// SPDX-License-Identifier: MIT
// What holds of every file whose directories point all over it, whatever it says.
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "reading.h"

namespace brivo::images {

/// Little is fetched, and all that is found lies in the file.
inline void expectBounded(const std::string& bytes) {
  for (const auto copy : {copySequentialProperties, copyImageProperties, copyContainerProperties}) {
    const CountingSource source(bytes);
    const auto found = copy(source);
    EXPECT_LE(source.reads(), 5u);
    EXPECT_LE(source.bytesRead(), 262'144u);
    if (!found) continue;
    EXPECT_LE(found->orientation, 8);
    EXPECT_LE(found->thumbnail.offset + found->thumbnail.length, bytes.size());
    for (const EmbeddedImage& image : found->embedded) EXPECT_LE(image.offset + image.length, bytes.size());
  }
}

/// The same for the file with any one of its bytes changed.
inline void expectBoundedWithOtherBytes(const std::string& bytes) {
  for (std::size_t place = 0; place < bytes.size(); ++place) {
    for (const char other : {'\0', '\1', '\x7F', '\xFF'}) {
      std::string changed = bytes;
      changed[place] = other;
      expectBounded(changed);
    }
  }
}

}  // namespace brivo::images
