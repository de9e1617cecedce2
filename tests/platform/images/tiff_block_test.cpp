// SPDX-License-Identifier: MIT
#include "platform/images/tiff_block.h"

#include <gtest/gtest.h>

#include "reading.h"

namespace brivo::images {
namespace {

using test::integer;
using test::TiffBytes;

/// A parse of bytes, which it owns.
class ParsedBytes {
 public:
  explicit ParsedBytes(std::string bytes) : source_(std::move(bytes)), parse_(source_, Scope::all) {
    parse_.ranges.allow(kForDirectories);
  }
  std::optional<TiffBlock> block() { return TiffBlock::at(parse_, 0, source_.size()); }
  Parse& parse() { return parse_; }
  const CountingSource& source() const { return source_; }

 private:
  const CountingSource source_;
  Parse parse_;
};

std::string textOf(std::span<const std::byte> bytes) {
  return {reinterpret_cast<const char*>(bytes.data()), bytes.size()};
}

TEST(TiffBlock, ValuesAreFoundInPlaceAndBehindTheDirectory) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    for (const bool big : {false, true}) {
      TiffBytes tiff(order, big);
      tiff.beginDirectory();
      tiff.shorts(1, {7, 8});
      tiff.longs(2, {70'000, 80'000, 90'000});
      tiff.ascii(3, "more text than fits in place");
      ParsedBytes bytes(tiff.build());
      auto block = bytes.block();
      ASSERT_TRUE(block);
      EXPECT_EQ(block->order(), order);
      EXPECT_EQ(block->magic(), big ? 43 : 42);
      const TiffDirectory directory = block->directory(block->firstDirectory());
      ASSERT_EQ(directory.entries.size(), 3u);
      EXPECT_EQ(directory.next, 0u);
      EXPECT_EQ(block->number(directory, 1), 7u);
      EXPECT_EQ(block->number(*directory.find(1), 1), 8u);
      EXPECT_EQ(block->number(*directory.find(1), 2), std::nullopt);
      EXPECT_EQ(block->number(*directory.find(2), 2), 90'000u);
      EXPECT_EQ(block->text(*directory.find(3)), "more text than fits in place");
      EXPECT_EQ(block->number(*directory.find(3)), std::nullopt) << "text is no number";
      EXPECT_EQ(directory.find(4), nullptr);
      EXPECT_EQ(block->number(directory, 4), std::nullopt);
    }
  }
}

TEST(TiffBlock, EveryIntegerTypeIsANumberAndNoOtherOne) {
  struct Case {
    std::uint16_t type;
    std::string value;
    std::optional<std::uint64_t> number;
  };
  const Case cases[] = {
      {1, integer(200, 1), 200},
      {2, "7", std::nullopt},
      {3, integer(60'000, 2), 60'000},
      {4, integer(0xFFFFFFFF, 4), 0xFFFFFFFF},
      {5, integer(1, 4) + integer(2, 4), std::nullopt},
      {6, integer(200, 1), 200},
      {7, integer(9, 1), 9},
      {8, integer(60'000, 2), 60'000},
      {9, integer(0xFFFFFFFF, 4), 0xFFFFFFFF},
      {10, integer(1, 4) + integer(2, 4), std::nullopt},
      {11, integer(1, 4), std::nullopt},
      {12, integer(1, 8), std::nullopt},
      {13, integer(8, 4), 8},
      {16, integer(1ULL << 40, 8), 1ULL << 40},
      {17, integer(1ULL << 40, 8), 1ULL << 40},
      {18, integer(1ULL << 40, 8), 1ULL << 40},
      {129, "7", std::nullopt},
  };
  for (const Case& each : cases) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.raw(1, each.type, 1, each.value);
    ParsedBytes bytes(tiff.build());
    auto block = bytes.block();
    EXPECT_EQ(block->number(block->directory(8), 1), each.number) << each.type;
  }
}

TEST(TiffBlock, EntriesOfUnknownTypesAreLeftOutAndTheOthersStay) {
  TiffBytes tiff;
  tiff.beginDirectory();
  for (const std::uint16_t type : {0, 14, 15, 19, 128, 130, 256, 65'535}) tiff.raw(type, type, 1, "abcd");
  tiff.shorts(9, {5});
  ParsedBytes bytes(tiff.build());
  auto block = bytes.block();
  const TiffDirectory directory = block->directory(8);
  ASSERT_EQ(directory.entries.size(), 1u);
  EXPECT_EQ(block->number(directory, 9), 5u);
}

TEST(TiffBlock, CountsThatNoFileHoldsLeaveTheEntryOut) {
  for (const bool big : {false, true}) {
    TiffBytes tiff(std::endian::little, big);
    tiff.beginDirectory();
    const std::size_t width = big ? 8 : 4;
    for (const std::uint16_t type : {1, 2, 3, 4, 5, 7, 12, 16})
      tiff.raw(type, type, big ? ~0ULL : 0xFFFFFFFF, integer(8, width));
    tiff.shorts(99, {5});
    ParsedBytes bytes(tiff.build());
    auto block = bytes.block();
    const TiffDirectory directory = block->directory(block->firstDirectory());
    ASSERT_EQ(directory.entries.size(), 1u);
    EXPECT_EQ(directory.entries[0].tag, 99);
  }
}

TEST(TiffBlock, ValuesThatLeaveTheBlockAreEmpty) {
  for (const std::uint64_t offset : {0xFFFFFFFFULL, 0xFFFFFFF0ULL, 60ULL}) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.raw(1, 4, 8, integer(offset, 4));
    tiff.raw(2, 2, 8, integer(offset, 4));
    std::string file = tiff.build() + std::string(24, 'x');
    ParsedBytes bytes(file);
    auto block = bytes.block();
    const TiffDirectory directory = block->directory(8);
    ASSERT_EQ(directory.entries.size(), 2u);
    EXPECT_TRUE(block->bytes(directory.entries[0]).empty()) << offset;
    EXPECT_FALSE(block->number(directory, 1)) << offset;
    EXPECT_TRUE(block->text(directory.entries[1]).empty()) << offset;
  }
}

TEST(TiffBlock, ABlockEndsWhereItsLengthSays) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(1, "more text than fits in place");
  ParsedBytes bytes("before" + tiff.build());
  auto block = TiffBlock::at(bytes.parse(), 6, 30);
  ASSERT_TRUE(block);
  EXPECT_EQ(block->start(), 6u);
  EXPECT_EQ(block->length(), 30u);
  const TiffDirectory directory = block->directory(8);
  ASSERT_EQ(directory.entries.size(), 1u);
  EXPECT_TRUE(block->bytes(directory.entries[0]).empty());
  EXPECT_TRUE(block->directory(30).entries.empty());
}

TEST(TiffBlock, ADirectoryIsReadOnce) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(1, {7});
  ParsedBytes bytes(tiff.build());
  auto block = bytes.block();
  EXPECT_EQ(block->directory(8).entries.size(), 1u);
  EXPECT_TRUE(block->directory(8).entries.empty());
}

TEST(TiffBlock, DirectoriesOfAChainWithoutEndRunOut) {
  // Each begins two bytes behind the one before, and is full of others.
  std::string file = "II" + integer(42, 2) + integer(8, 4);
  for (int i = 0; i < 65'535; ++i) file += integer(1, 2);
  ParsedBytes bytes(file);
  auto block = bytes.block();
  std::size_t read = 0;
  for (std::uint64_t offset = 8; offset < file.size(); offset += 2)
    read += block->directory(offset).entries.empty() ? 0 : 1;
  EXPECT_GT(read, 0u);
  EXPECT_LE(read, 512u);
  EXPECT_FALSE(bytes.parse().spendDirectory());
}

TEST(TiffBlock, TheEntriesOfAllDirectoriesTogetherRunOut) {
  std::string file = "II" + integer(42, 2) + integer(8, 4) + integer(65'535, 2);
  for (int i = 0; i < 65'535; ++i) file += integer(1, 2) + integer(3, 2) + integer(1, 4) + integer(7, 4);
  ParsedBytes bytes(file);
  auto block = bytes.block();
  const TiffDirectory directory = block->directory(8);
  EXPECT_LE(directory.entries.size(), 8192u);
  EXPECT_EQ(directory.next, 0u) << "what stands behind unread entries is no link";
  EXPECT_EQ(bytes.parse().spendEntries(1), 0u);
}

TEST(TiffBlock, ADirectoryThatTheFileCutsShortGivesTheEntriesThatAreThere) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(1, {7});
  tiff.shorts(2, {8});
  const std::string file = tiff.build();
  const auto entriesIn = [&](std::size_t length) {
    ParsedBytes bytes(file.substr(0, length));
    auto block = bytes.block();
    return block ? block->directory(8).entries.size() : 99;
  };
  EXPECT_EQ(entriesIn(7), 99u) << "no header";
  EXPECT_EQ(entriesIn(8), 0u);
  EXPECT_EQ(entriesIn(10), 0u);
  EXPECT_EQ(entriesIn(22), 1u);
  EXPECT_EQ(entriesIn(33), 1u);
  EXPECT_EQ(entriesIn(34), 2u) << "the link may be missing";
}

TEST(TiffBlock, TextEndsAtItsFirstNul) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.raw(1, 2, 12, std::string("first\0second", 12));
  tiff.raw(2, 2, 12, "no nul at al");
  ParsedBytes bytes(tiff.build());
  auto block = bytes.block();
  const TiffDirectory directory = block->directory(8);
  EXPECT_EQ(block->text(*directory.find(1)), "first");
  EXPECT_EQ(block->text(*directory.find(2)), "no nul at al");
}

TEST(TiffBlock, TheFirstBytesOfALongValueCanBeHadAlone) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.undefined(1, "begin" + std::string(300'000, 'x'));
  ParsedBytes bytes(tiff.build());
  auto block = bytes.block();
  const TiffDirectory directory = block->directory(8);
  EXPECT_EQ(textOf(block->bytes(directory.entries[0], 5)), "begin");
  EXPECT_TRUE(block->bytes(directory.entries[0]).empty()) << "more than may be fetched";
}

TEST(TiffBlock, ABigTiffMayPointBeyondFourGigabytesAndFindsNothing) {
  TiffBytes tiff(std::endian::little, true);
  tiff.beginDirectory();
  tiff.raw(1, 4, 4, integer(~0ULL - 3, 8));
  ParsedBytes bytes(tiff.build());
  auto block = bytes.block();
  const TiffDirectory directory = block->directory(16);
  ASSERT_EQ(directory.entries.size(), 1u);
  EXPECT_TRUE(block->bytes(directory.entries[0]).empty());
  EXPECT_TRUE(block->directory(~0ULL).entries.empty());
  EXPECT_TRUE(block->directory(1ULL << 32).entries.empty());
}

TEST(TiffBlock, ABlockThatBeginsBehindTheFileIsEmpty) {
  ParsedBytes bytes("short");
  TiffBlock block(bytes.parse(), 1ULL << 40, ~0ULL, std::endian::big);
  EXPECT_EQ(block.length(), 0u);
  EXPECT_TRUE(block.directory(0).entries.empty());
  EXPECT_FALSE(TiffBlock::at(bytes.parse(), 1ULL << 40, ~0ULL));
}

}  // namespace
}  // namespace brivo::images
