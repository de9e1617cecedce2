// SPDX-License-Identifier: MIT
#include "platform/images/iso_boxes.h"

#include <gtest/gtest.h>

#include "iso_bytes.h"
#include "reading.h"

namespace brivo::images {
namespace {

using test::big;
using test::box;
using test::fullBox;

/// The boxes that stand in a row in some bytes, as "type start length".
std::string rowOf(const std::string& bytes) {
  const MemorySource source(std::as_bytes(std::span(bytes)));
  Parse parse(source, Scope::all);
  std::string row;
  Boxes boxes(parse);
  while (const auto found = boxes.next()) {
    row += test::big(found->type, 4) + " " + std::to_string(found->start) + " " +
           std::to_string(found->length) + "\n";
  }
  return row;
}

TEST(IsoBoxes, StandInARow) {
  EXPECT_EQ(rowOf(box("free", "") + box("mdat", "abc")), "free 8 0\nmdat 16 3\n");
  EXPECT_EQ(rowOf(""), "");
}

TEST(IsoBoxes, ASizeCanHave64Bits) {
  EXPECT_EQ(rowOf(big(1, 4) + "mdat" + big(19, 8) + "abc" + box("free", "")), "mdat 16 3\nfree 27 0\n");
}

TEST(IsoBoxes, ASizeOfZeroGoesToTheEnd) {
  EXPECT_EQ(rowOf(box("free", "") + big(0, 4) + "mdat" + "abcdef"), "free 8 0\nmdat 16 6\n");
}

TEST(IsoBoxes, AreNoLongerThanWhatHoldsThem) {
  EXPECT_EQ(rowOf(big(100, 4) + "mdat" + "abc"), "mdat 8 3\n");
  EXPECT_EQ(rowOf(big(1, 4) + "mdat" + big(~0ULL, 8) + "abc"), "mdat 16 3\n");

  const std::string bytes = box("moov", big(100, 4) + "trak" + "abc") + box("free", "");
  const MemorySource source(std::as_bytes(std::span(bytes)));
  Parse parse(source, Scope::all);
  const Box track = childOf(parse, childOf(parse, Box{.length = bytes.size()}, fourCharacters("moov")),
                            fourCharacters("trak"));
  EXPECT_EQ(track.start, 16u);
  EXPECT_EQ(track.length, 3u);
}

TEST(IsoBoxes, EndWhereASizeIsLessThanTheHeader) {
  for (const unsigned size : {2U, 4U, 7U})
    EXPECT_EQ(rowOf(box("free", "") + big(size, 4) + "mdat" + box("free", "")), "free 8 0\n") << size;
  EXPECT_EQ(rowOf(big(1, 4) + "mdat" + big(15, 8) + "abc"), "");
  EXPECT_EQ(rowOf(big(20, 4) + "uuid" + std::string(16, 'u')), "");
}

TEST(IsoBoxes, EndWhereAHeaderIsCut) {
  const std::string bytes = box("free", "") + test::uuidBox(1, 2, "") + big(1, 4) + "mdat" + big(16, 8);
  for (std::size_t length = 0; length < bytes.size(); ++length) {
    const std::string row = rowOf(bytes.substr(0, length));
    EXPECT_EQ(row, length < 8 ? "" : length < 32 ? "free 8 0\n" : "free 8 0\nuuid 32 0\n") << length;
  }
}

TEST(IsoBoxes, AUuidBoxHasAnExtendedType) {
  const std::string bytes = test::uuidBox(0x0102030405060708, 0x1112131415161718, "abc");
  const MemorySource source(std::as_bytes(std::span(bytes)));
  Parse parse(source, Scope::all);
  const auto found = Boxes(parse).next();
  ASSERT_TRUE(found);
  EXPECT_EQ(found->uuid, (std::array<std::uint64_t, 2>{0x0102030405060708, 0x1112131415161718}));
  EXPECT_EQ(found->start, 24u);
  EXPECT_EQ(found->length, 3u);
}

TEST(IsoBoxes, AChildIsTheFirstOfItsTypeBehindWhatStandsBefore) {
  const std::string bytes = fullBox("meta", 0, 0, box("free", "") + box("pitm", "1") + box("pitm", "22"));
  const MemorySource source(std::as_bytes(std::span(bytes)));
  Parse parse(source, Scope::all);
  const Box meta = childOf(parse, Box{.length = bytes.size()}, fourCharacters("meta"));
  EXPECT_EQ(childOf(parse, meta, fourCharacters("pitm"), kFullBoxBytes).length, 1u);
  EXPECT_EQ(childOf(parse, meta, fourCharacters("iloc"), kFullBoxBytes).length, 0u);
  EXPECT_EQ(childOf(parse, meta, fourCharacters("pitm"), bytes.size()).type, 0u);
}

TEST(IsoBoxes, BoxesWithoutEndAreGivenUp) {
  std::string bytes;
  for (int i = 0; i < 100'000; ++i) bytes += box("free", "");
  CountingSource source(bytes);
  Parse parse(source, Scope::all);
  parse.ranges.allow({1 << 20, 4, 1 << 20});
  Boxes boxes(parse);
  std::size_t count = 0;
  while (boxes.next()) ++count;
  EXPECT_EQ(count, 8192u);
}

TEST(IsoBoxes, BrandsAreTheMajorOneAndTheCompatibleOnes) {
  const auto brandsIn = [](const std::string& bytes) {
    const MemorySource source(std::as_bytes(std::span(bytes)));
    Parse parse(source, Scope::all);
    return brandsOf(parse);
  };
  EXPECT_EQ(brandsIn(test::fileType("heic", "mif1miaf")),
            (std::vector{fourCharacters("heic"), fourCharacters("mif1"), fourCharacters("miaf")}));
  EXPECT_TRUE(brandsIn(box("moov", "")).empty());
  EXPECT_TRUE(brandsIn("").empty());
  EXPECT_LE(brandsIn(test::fileType("heic", std::string(16'000, 'x'))).size(), 64u);
}

TEST(IsoBoxes, ATrackGivesItsSizeAndItsFirstSample) {
  for (const bool wide : {false, true}) {
    const std::string bytes = box("moov", test::pictureTrack(256, 144, 4711, 815, wide));
    const MemorySource source(std::as_bytes(std::span(bytes)));
    Parse parse(source, Scope::all);
    const PictureTrack track = firstTrack(parse, *Boxes(parse).next());
    EXPECT_EQ(track.size, (PixelSize{256, 144}));
    EXPECT_EQ(track.sampleOffset, 4711u);
    EXPECT_EQ(track.sampleLength, 815u);
  }
}

TEST(IsoBoxes, AMovieWithoutATrackGivesNothing) {
  const std::string bytes = box("moov", box("trak", box("mdia", "")));
  const MemorySource source(std::as_bytes(std::span(bytes)));
  Parse parse(source, Scope::all);
  const PictureTrack track = firstTrack(parse, *Boxes(parse).next());
  EXPECT_FALSE(track.size);
  EXPECT_EQ(track.sampleLength, 0u);
}

}  // namespace
}  // namespace brivo::images
