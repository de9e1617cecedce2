// SPDX-License-Identifier: MIT
#include "platform/images/exif_entries.h"

#include <gtest/gtest.h>

#include <cmath>

#include "platform/images/exif_names.h"
#include "support/image_bytes.h"

namespace brivo::images {
namespace {

using test::integer;

constexpr std::uint16_t kByte = 1, kAscii = 2, kShort = 3, kLong = 4, kRational = 5, kSignedByte = 6,
                        kUndefined = 7, kSignedShort = 8, kSignedLong = 9, kSignedRational = 10, kReal32 = 11,
                        kReal64 = 12, kDirectory = 13, kLong64 = 16, kSignedLong64 = 17, kUtf8 = 129;

std::span<const std::byte> bytesOf(std::string_view text) { return std::as_bytes(std::span(text)); }

/// The value that an entry has whose bytes are `value`.
std::optional<Value> valueOf(std::uint16_t type, std::string_view value,
                             std::endian order = std::endian::little) {
  ExifEntries entries;
  entries.add(ExifGroup::makerNote, 1, type, bytesOf(value), order);
  return entries.find(ExifGroup::makerNote, "1");
}

double realOf(std::uint16_t type, std::string_view value) { return valueOf(type, value)->asReal().value(); }

TEST(ExifEntries, EveryTypeBecomesAValueInEitherByteOrder) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const auto number = [&](std::uint64_t value, std::size_t width) { return integer(value, width, order); };
    EXPECT_EQ(valueOf(kByte, number(200, 1), order), Value(std::uint32_t{200}));
    EXPECT_EQ(valueOf(kShort, number(60'000, 2), order), Value(std::uint32_t{60'000}));
    EXPECT_EQ(valueOf(kLong, number(4'000'000'000, 4), order), Value(std::uint32_t{4'000'000'000}));
    EXPECT_EQ(valueOf(kDirectory, number(8, 4), order), Value(std::uint32_t{8}));
    EXPECT_EQ(valueOf(kSignedByte, number(0xFE, 1), order), Value(std::int32_t{-2}));
    EXPECT_EQ(valueOf(kSignedShort, number(0xFFFE, 2), order), Value(std::int32_t{-2}));
    EXPECT_EQ(valueOf(kSignedLong, number(0xFFFFFFFE, 4), order), Value(std::int32_t{-2}));
    EXPECT_EQ(valueOf(kLong64, number(1ULL << 40, 8), order), Value(std::uint64_t{1} << 40));
    EXPECT_EQ(valueOf(kSignedLong64, number(~0ULL, 8), order), Value(std::int64_t{-1}));
    EXPECT_EQ(valueOf(kRational, number(1, 4) + number(4, 4), order), Value(0.25));
    EXPECT_EQ(valueOf(kSignedRational, number(0xFFFFFFFF, 4) + number(4, 4), order), Value(-0.25));
    EXPECT_EQ(valueOf(kReal32, number(0x3F800000, 4), order), Value(1.0));
    EXPECT_EQ(valueOf(kReal64, number(0x3FF0000000000000, 8), order), Value(1.0));
    EXPECT_EQ(valueOf(kAscii, "text", order), Value("text"));
    EXPECT_EQ(valueOf(kUtf8, "t\xC3\xA9xt", order), Value("t\xC3\xA9xt"));
    EXPECT_EQ(valueOf(kUndefined, "0230", order), Value(Data::copyOf(bytesOf("0230"))));
  }
}

TEST(ExifEntries, TypesThatDoNotExistAreNotKept) {
  for (const std::uint16_t type : {0, 14, 15, 19, 130, 255, 257, 65'535})
    EXPECT_EQ(valueOf(type, "abcdefgh"), std::nullopt) << type;
}

TEST(ExifEntries, TrailingNulsOfTextAreLeftOut) {
  EXPECT_EQ(valueOf(kAscii, std::string_view("text\0\0\0", 7)), Value("text"));
  EXPECT_EQ(valueOf(kAscii, std::string_view("\0\0", 2)), Value(""));
  EXPECT_EQ(valueOf(kAscii, "text  "), Value("text  ")) << "blanks stay";
}

TEST(ExifEntries, PartsOfTextAreJoinedByANewline) {
  ExifEntries entries;
  entries.add(ExifGroup::tiff, 0x8298, kAscii, bytesOf({"photographer\0editor\0", 20}), std::endian::big);
  EXPECT_EQ(entries.find(ExifGroup::tiff, "Copyright"), Value("photographer\neditor"));
}

TEST(ExifEntries, ZeroDenominatorsGiveInfinityOrNoNumber) {
  const std::string zero = integer(0, 4), one = integer(1, 4), minusOne = integer(0xFFFFFFFF, 4);
  EXPECT_EQ(realOf(kRational, one + zero), HUGE_VAL);
  EXPECT_EQ(realOf(kSignedRational, minusOne + zero), -HUGE_VAL);
  EXPECT_TRUE(std::isnan(realOf(kRational, zero + zero)));
  EXPECT_TRUE(std::isnan(realOf(kSignedRational, zero + zero)));
  EXPECT_EQ(realOf(kRational, zero + one), 0.0);
}

TEST(ExifEntries, SeveralElementsAreAnArray) {
  EXPECT_EQ(valueOf(kShort, integer(7, 2) + integer(8, 2)),
            Value(Array{Value(std::uint32_t{7}), Value(std::uint32_t{8})}));
  EXPECT_EQ(valueOf(kRational,
                    integer(1, 4, std::endian::big) + integer(2, 4, std::endian::big) +
                        integer(3, 4, std::endian::big) + integer(4, 4, std::endian::big),
                    std::endian::big),
            Value(Array{Value(0.5), Value(0.75)}));
}

TEST(ExifEntries, OnlyTagsWithANameAreKeptButInMakerNotes) {
  ExifEntries entries;
  for (const auto group : {ExifGroup::exif, ExifGroup::tiff, ExifGroup::gps})
    entries.add(group, 0xBEEF, kByte, bytesOf("x"), std::endian::little);
  EXPECT_TRUE(entries.empty());
  entries.add(ExifGroup::makerNote, 0xBEEF, kByte, bytesOf("x"), std::endian::little);
  EXPECT_EQ(entries.find(ExifGroup::makerNote, "48879"), Value(std::uint32_t{'x'}));
  EXPECT_EQ(entries.find(ExifGroup::makerNote, "048879x"), std::nullopt);
  EXPECT_EQ(entries.find(ExifGroup::makerNote, "70000"), std::nullopt);
}

TEST(ExifEntries, GroupsAreApart) {
  ExifEntries entries;
  entries.add(ExifGroup::gps, 0x0001, kAscii, bytesOf("N"), std::endian::little);
  entries.add(ExifGroup::makerNote, 0x0001, kAscii, bytesOf("note"), std::endian::little);
  EXPECT_TRUE(entries.has(ExifGroup::gps));
  EXPECT_TRUE(entries.has(ExifGroup::makerNote));
  EXPECT_FALSE(entries.has(ExifGroup::exif));
  EXPECT_EQ(entries.dictionary(ExifGroup::gps), (Dictionary{{"LatitudeRef", "N"}}));
  EXPECT_EQ(entries.dictionary(ExifGroup::makerNote), (Dictionary{{"1", "note"}}));
  EXPECT_TRUE(entries.dictionary(ExifGroup::tiff).empty());
}

TEST(ExifEntries, TheFirstOfTwoEntriesWithOneTagCounts) {
  ExifEntries entries;
  entries.add(ExifGroup::tiff, 0x010F, kAscii, bytesOf("first"), std::endian::little);
  entries.add(ExifGroup::tiff, 0x010F, kAscii, bytesOf("second"), std::endian::little);
  EXPECT_EQ(entries.find(ExifGroup::tiff, "Make"), Value("first"));
  EXPECT_EQ(entries.dictionary(ExifGroup::tiff), (Dictionary{{"Make", "first"}}));
}

TEST(ExifEntries, EmptyAndTooLongValuesAreNotKept) {
  EXPECT_EQ(valueOf(kAscii, ""), std::nullopt);
  EXPECT_TRUE(valueOf(kAscii, std::string(ExifEntries::kLongestValue, 'x')));
  EXPECT_EQ(valueOf(kAscii, std::string(ExifEntries::kLongestValue + 1, 'x')), std::nullopt);
}

TEST(ExifEntries, AllTogetherTakeNoMoreThanTheirLimit) {
  ExifEntries entries;
  const std::string value(4000, 'x');
  for (std::uint16_t tag = 0; tag < 100; ++tag)
    entries.add(ExifGroup::makerNote, tag, kAscii, bytesOf(value), std::endian::little);
  EXPECT_LE(entries.packed().size(), ExifEntries::kMostBytes);
  EXPECT_EQ(entries.dictionary(ExifGroup::makerNote).size(), 4u);
  entries.add(ExifGroup::makerNote, 100, kAscii, bytesOf("short"), std::endian::little);
  EXPECT_EQ(entries.find(ExifGroup::makerNote, "100"), Value("short")) << "what fits is still kept";
}

TEST(ExifEntries, PackedBytesGiveTheSameEntriesAgain) {
  ExifEntries entries;
  entries.add(ExifGroup::tiff, 0x010F, kAscii, bytesOf("Maker"), std::endian::big);
  entries.add(ExifGroup::exif, 0x829A, kRational, bytesOf(integer(1, 4) + integer(8, 4)),
              std::endian::little);
  const ExifEntries again({entries.packed().begin(), entries.packed().end()});
  EXPECT_EQ(again.dictionary(ExifGroup::tiff), entries.dictionary(ExifGroup::tiff));
  EXPECT_EQ(again.dictionary(ExifGroup::exif), (Dictionary{{"ExposureTime", 0.125}}));
}

TEST(ExifEntries, TheByteOrderOfTheFileDoesNotShowInPackedBytes) {
  ExifEntries little, big;
  const auto rational = [](std::endian order) { return integer(1, 4, order) + integer(8, 4, order); };
  little.add(ExifGroup::exif, 0x829A, kRational, bytesOf(rational(std::endian::little)), std::endian::little);
  big.add(ExifGroup::exif, 0x829A, kRational, bytesOf(rational(std::endian::big)), std::endian::big);
  EXPECT_TRUE(std::ranges::equal(little.packed(), big.packed()));
}

TEST(ExifEntries, EveryCutOfPackedBytesGivesTheEntriesBeforeIt) {
  ExifEntries entries;
  entries.add(ExifGroup::tiff, 0x010F, kAscii, bytesOf("Maker"), std::endian::little);
  entries.add(ExifGroup::tiff, 0x0110, kAscii, bytesOf("Model"), std::endian::little);
  const auto packed = entries.packed();
  for (std::size_t length = 0; length <= packed.size(); ++length) {
    const ExifEntries cut({packed.begin(), packed.begin() + static_cast<std::ptrdiff_t>(length)});
    EXPECT_EQ(cut.dictionary(ExifGroup::tiff).size(), length * 2 / packed.size()) << length;
  }
}

TEST(ExifEntries, GarbageInPackedBytesIsLeftOut) {
  for (unsigned byte = 0; byte < 256; ++byte) {
    const ExifEntries entries(std::vector<std::byte>(1000, std::byte(byte)));
    for (const auto group : {ExifGroup::exif, ExifGroup::tiff, ExifGroup::gps})
      EXPECT_TRUE(entries.dictionary(group).empty() || entries.has(group)) << byte;
    EXPECT_EQ(entries.find(ExifGroup::tiff, "Make"), std::nullopt) << byte;
  }
}

TEST(ExifNames, NamesAndTagsGoBothWays) {
  std::size_t names = 0;
  for (const auto group : {ExifGroup::exif, ExifGroup::tiff, ExifGroup::gps}) {
    for (unsigned tag = 0; tag <= 0xFFFF; ++tag) {
      const auto name = nameOfTag(group, static_cast<std::uint16_t>(tag));
      if (name.empty()) continue;
      ++names;
      EXPECT_EQ(tagOfName(group, name), tag) << name;
    }
  }
  EXPECT_GT(names, 100u);
}

TEST(ExifNames, TagsHaveTheNamesOfTheStandard) {
  EXPECT_EQ(nameOfTag(ExifGroup::tiff, 0x0132), "DateTime");
  EXPECT_EQ(nameOfTag(ExifGroup::exif, 0x9003), "DateTimeOriginal");
  EXPECT_EQ(nameOfTag(ExifGroup::exif, 0x9004), "DateTimeDigitized");
  EXPECT_EQ(nameOfTag(ExifGroup::gps, 0x0002), "Latitude") << "the group says that it is of GPS";
}

TEST(ExifNames, LayoutOfTheFileHasNoNames) {
  for (const std::uint16_t tag : {0x0111, 0x0117, 0x014A, 0x0201, 0x0202, 0x8769, 0x8825})
    EXPECT_EQ(nameOfTag(ExifGroup::tiff, tag), "") << tag;
  EXPECT_EQ(nameOfTag(ExifGroup::exif, 0x927C), "");
  EXPECT_EQ(nameOfTag(ExifGroup::makerNote, 1), "");
  EXPECT_EQ(tagOfName(ExifGroup::exif, "NoSuchName"), std::nullopt);
}

}  // namespace
}  // namespace brivo::images
