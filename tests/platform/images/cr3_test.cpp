// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include "bounded.h"
#include "iso_bytes.h"
#include "reading.h"

namespace brivo::images {
namespace {

using test::big;
using test::box;
using test::fullBox;
using test::jpeg;
using test::TiffBytes;

std::string mainBlock() {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0100, {6000});
  tiff.shorts(0x0101, {4000});
  tiff.ascii(0x010F, "Canon");
  tiff.shorts(0x0112, {8});
  return tiff.build();
}

std::string exifBlock() {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x9003, "2021:06:01 10:00:00");
  return tiff.build();
}

std::string gpsBlock() {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x0001, "N");
  return tiff.build();
}

/// What a file is made of. Its parts can be left out or be of any kind.
struct Parts {
  std::string main = box("CMT1", mainBlock());
  std::string exif = box("CMT2", exifBlock());
  std::string gps = box("CMT4", gpsBlock());
  std::string thumbnail = fullBox("THMB", 0, 0, std::string(12, '\0') + jpeg(160, 120));
  std::string preview = fullBox("PRVW", 0, 0, std::string(12, '\0') + jpeg(1620, 1080));
  std::string picture = jpeg(6000, 4000);
  std::string between;              ///< boxes before the preview
  std::uint64_t pictureOffset = 0;  ///< 0: where it is
};

std::string built(const Parts& parts) {
  const auto movie = [&](std::uint64_t offset) {
    return box("moov", test::uuidBox(0x85C0B687820F11E0, 0x8111F4CE462B6A48,
                                     box("CNCV", "CanonCR3") + parts.main + parts.exif + box("CMT3", "") +
                                         parts.gps + parts.thumbnail) +
                           test::pictureTrack(6000, 4000, offset, parts.picture.size()));
  };
  const std::string type = test::fileType("crx ", "crx isom");
  const std::string preview =
      test::uuidBox(0xEAF42B5E1C984B88, 0xB9FBB7DC406E4D16, big(1, 8) + parts.preview);
  const std::uint64_t offset = type.size() + movie(0).size() + parts.between.size() + preview.size() + 8;
  return type + movie(parts.pictureOffset != 0 ? parts.pictureOffset : offset) + parts.between + preview +
         box("mdat", parts.picture);
}

TEST(Cr3, TheBlocksOfTheCameraAreRead) {
  const std::string bytes = built({});
  const auto found = readAll(bytes);
  ASSERT_TRUE(found);
  EXPECT_EQ(found->size, (PixelSize{6000, 4000}));
  EXPECT_EQ(found->crop, (PixelSize{6000, 4000}));
  EXPECT_EQ(found->orientation, 8);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Canon"));
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
  EXPECT_EQ(found->entries.find(ExifGroup::gps, "LatitudeRef"), Value("N"));
  EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
  EXPECT_EQ(bytes.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
}

TEST(Cr3, PositionIsReadOnlyWhenEverythingIsWanted) {
  EXPECT_FALSE(readBasics(built({}))->entries.has(ExifGroup::gps));
  EXPECT_TRUE(readBasics(built({}))->entries.has(ExifGroup::exif));
}

TEST(Cr3, TheJpegsInItAreEmbedded) {
  const std::string bytes = built({});
  const auto found = readPreviews(bytes);
  ASSERT_EQ(found->embedded.size(), 3u);
  EXPECT_EQ(found->orientation, 8);
  EXPECT_EQ(found->crop, (PixelSize{6000, 4000}));
  const auto bytesOf = [&](const EmbeddedImage& image) { return bytes.substr(image.offset, image.length); };
  EXPECT_EQ(bytesOf(found->embedded[0]), jpeg(160, 120));
  EXPECT_EQ(bytesOf(found->embedded[1]), jpeg(6000, 4000));
  EXPECT_EQ(found->embedded[1].size, (PixelSize{6000, 4000}));
  EXPECT_EQ(bytesOf(found->embedded[2]), jpeg(1620, 1080));
  EXPECT_EQ(found->embedded[2].size, (PixelSize{1620, 1080}));
}

TEST(Cr3, TheHeaderOfAPreviewCanHaveAnyLength) {
  Parts parts;
  parts.thumbnail = fullBox("THMB", 1, 0, std::string(20, '\0') + jpeg(160, 120));
  const std::string bytes = built(parts);
  const auto found = readBasics(bytes);
  EXPECT_EQ(bytes.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
}

TEST(Cr3, WithoutAMainBlockTheSizeIsThatOfTheTrack) {
  Parts parts;
  parts.main.clear();
  EXPECT_EQ(readBasics(built(parts))->size, (PixelSize{6000, 4000}));
  EXPECT_EQ(readBasics(built(parts))->orientation, 0);
}

TEST(Cr3, AnExifThumbnailGoesBeforeThatOfTheBox) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.shorts(0x0112, {1});
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(16, 12));
  Parts parts;
  parts.main = box("CMT1", tiff.build());
  EXPECT_EQ(readBasics(built(parts))->thumbnail.size, (PixelSize{16, 12}));
}

TEST(Cr3, WhatIsNoJpegIsNoEmbeddedPicture) {
  Parts parts;
  parts.thumbnail = fullBox("THMB", 0, 0, "text in the place of a picture");
  parts.preview = fullBox("PRVW", 0, 0, "");
  parts.picture = "text";
  EXPECT_TRUE(readPreviews(built(parts))->embedded.empty());
  EXPECT_FALSE(readPreviews(built(parts))->thumbnail);
}

TEST(Cr3, PicturesOutsideTheFileAreLeftOut) {
  for (const std::uint64_t offset : {std::uint64_t{1'000'000}, ~std::uint64_t{0}, ~std::uint64_t{0} - 200}) {
    Parts parts;
    parts.pictureOffset = offset;
    EXPECT_EQ(readPreviews(built(parts))->embedded.size(), 2u) << offset;
  }
}

TEST(Cr3, OnlyTheMajorBrandMakesOne) {
  EXPECT_FALSE(readBasics(test::fileType("isom", "crx ") + box("moov", "")));
  EXPECT_FALSE(readBasics(box("moov", "crx ")));
  ASSERT_TRUE(readBasics(test::fileType("crx ")));
  EXPECT_FALSE(*readBasics(test::fileType("crx ")));
}

TEST(Cr3, ALargeFileCostsFewReads) {
  Parts parts;
  parts.main += box("CMT3", std::string(14'000, 'n'));
  parts.thumbnail = fullBox("THMB", 0, 0, std::string(12, '\0') + jpeg(160, 120) + std::string(12'000, 't'));
  parts.between = test::uuidBox(1, 2, std::string(65'536, ' '));
  parts.preview = fullBox("PRVW", 0, 0, std::string(12, '\0') + jpeg(1620, 1080) + std::string(200'000, 'p'));
  parts.picture += std::string(1'000'000, 'x');
  const std::string bytes = built(parts);
  EXPECT_EQ(readPreviews(bytes)->embedded.size(), 3u);
  CountingSource source(bytes);
  EXPECT_EQ(copySequentialProperties(source)->thumbnail.size, (PixelSize{160, 120}));
  EXPECT_LE(source.reads(), 2u);
  expectBounded(bytes);
}

TEST(Cr3, EveryCutOfAFileGivesWhatIsLeft) {
  const std::string bytes = built({});
  for (std::size_t length = 0; length < bytes.size(); ++length) expectBounded(bytes.substr(0, length));
}

TEST(Cr3, NoByteThatIsDifferentLeadsOutOfTheFile) { expectBoundedWithOtherBytes(built({})); }

}  // namespace
}  // namespace brivo::images
