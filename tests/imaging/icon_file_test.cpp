// SPDX-License-Identifier: MIT
#include "imaging/icon_file.h"

#include <gtest/gtest.h>

#include <span>

#include "imaging/scaling.h"
#include "support/image_bytes.h"

namespace brivo::imaging {
namespace {

using test::integer;

/// A device-independent bitmap of 32 bits a pixel, all of them 0xAARRGGBB `pixel`, with its mask.
std::string bitmap(unsigned side, std::uint32_t pixel) {
  std::string bytes = integer(40, 4) + integer(side, 4) + integer(std::uint64_t{side} * 2, 4) +
                      integer(1, 2) + integer(32, 2) + std::string(24, '\0');
  for (unsigned i = 0; i < side * side; ++i) bytes += integer(pixel, 4);
  return bytes + std::string(std::size_t{side} * 4, '\0');
}

std::string icon(std::initializer_list<std::pair<unsigned, std::string>> images) {
  std::string file = integer(0, 2) + integer(1, 2) + integer(images.size(), 2);
  std::size_t offset = 6 + 16 * images.size();
  for (const auto& [side, bytes] : images) {
    file += integer(side % 256, 1) + integer(side % 256, 1) + integer(0, 2) + integer(1, 2) + integer(32, 2) +
            integer(bytes.size(), 4) + integer(offset, 4);
    offset += bytes.size();
  }
  for (const auto& [side, bytes] : images) file += bytes;
  return file;
}

images::MemorySource sourceOf(const std::string& file) {
  return images::MemorySource(std::as_bytes(std::span(file)));
}

TEST(IconFileTest, EveryImageTellsItsWidthAndIsDecoded) {
  const std::string file = icon({{16, bitmap(16, 0xFFFF0000)}, {32, bitmap(32, 0xFF00FF00)}});
  EXPECT_EQ(iconWidths(sourceOf(file)), (std::vector<std::uint32_t>{16, 32}));
  const auto second = decodeIcon(sourceOf(file), 1);
  ASSERT_TRUE(second);
  EXPECT_EQ(second->frame->width, 32);
  EXPECT_EQ(second->frame->height, 32) << "without the mask";
  const Frame pixels = unpacked(*second->frame);
  EXPECT_EQ(pixels->data[0][1], 0);
  EXPECT_EQ(pixels->data[0][2], 255);
  EXPECT_FALSE(decodeIcon(sourceOf(file), 2));
}

TEST(IconFileTest, AWidthOfZeroStandsFor256) {
  EXPECT_EQ(iconWidths(sourceOf(icon({{256, "not looked at"}}))), std::vector<std::uint32_t>{256});
}

TEST(IconFileTest, BadIconsAreNone) {
  const std::string file = icon({{16, bitmap(16, 0xFFFF0000)}});
  for (std::size_t length = 0; length < 900; length += 13) {
    const std::string cut = file.substr(0, length);
    EXPECT_FALSE(decodeIcon(sourceOf(cut), 0)) << length;
  }
  std::string outside = file;
  outside.replace(18, 4, "\xFF\xFF\xFF\xFF");
  EXPECT_FALSE(decodeIcon(sourceOf(outside), 0));
  EXPECT_TRUE(iconWidths(sourceOf("no icon")).empty());
}

}  // namespace
}  // namespace brivo::imaging
