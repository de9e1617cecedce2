// SPDX-License-Identifier: MIT
#include "imaging/slice_source.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <string_view>

namespace brivo::imaging {
namespace {

constexpr std::string_view kFile = "0123456789";

std::string readAll(const SliceSource& slice, std::uint64_t offset = 0) {
  std::string text(kFile.size() + 5, '.');
  text.resize(slice.read(std::as_writable_bytes(std::span(text)), offset));
  return text;
}

TEST(SliceSource, GivesThePartAlone) {
  const images::MemorySource file(std::as_bytes(std::span(kFile)));
  const SliceSource slice(file, 2, 5);
  EXPECT_EQ(slice.size(), 5u);
  EXPECT_EQ(readAll(slice), "23456");
  EXPECT_EQ(readAll(slice, 3), "56");
  EXPECT_EQ(readAll(slice, 5), "");
}

TEST(SliceSource, EndsWhereTheFileEnds) {
  const images::MemorySource file(std::as_bytes(std::span(kFile)));
  constexpr auto kMost = std::numeric_limits<std::uint64_t>::max();
  EXPECT_EQ(readAll(SliceSource(file, 8, kMost)), "89");
  EXPECT_EQ(readAll(SliceSource(file, 8, 3), kMost), "");
  EXPECT_EQ(SliceSource(file, 10, 1).size(), 0u);
  EXPECT_EQ(SliceSource(file, kMost, kMost).size(), 0u);
  EXPECT_EQ(readAll(SliceSource(file, kMost, kMost)), "");
}

}  // namespace
}  // namespace brivo::imaging
