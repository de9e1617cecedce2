// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <array>

#include "bounded.h"
#include "exif_bytes.h"
#include "iso_bytes.h"
#include "platform/images/heif_items.h"
#include "reading.h"

namespace brivo::images {
namespace {

using test::big;
using test::box;
using test::channels;
using test::extents;
using test::fullBox;
using test::HeifBytes;
using test::jpeg;
using test::mirror;
using test::TiffBytes;
using test::turn;

std::string exifBlock(unsigned orientation = 6) {
  return test::exifWithThumbnail(std::endian::big, orientation);
}

/// A picture of 4000 × 3000 with EXIF and a thumbnail that is a JPEG.
HeifBytes typical(HeifBytes::Form form = {}, HeifBytes::Where where = HeifBytes::Where::file) {
  HeifBytes file(form);
  file.item(1, "hvc1", "coded picture");
  file.item(2, "Exif", test::exifItem(exifBlock()), where);
  file.item(3, "jpeg", jpeg(320, 240), where);
  file.properties(1, {extents(4000, 3000), channels(10), turn(3)});
  file.properties(3, {extents(320, 240), turn(1)});
  file.reference("cdsc", 2, {1});
  file.reference("thmb", 3, {1});
  return file;
}

std::uint16_t orientationWith(std::initializer_list<std::string> properties) {
  HeifBytes file;
  file.item(1, "hvc1");
  file.properties(1, properties);
  return readBasics(file.build())->orientation;
}

void expectTypical(const std::string& bytes) {
  const auto found = readBasics(bytes);
  ASSERT_TRUE(found);
  EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
  EXPECT_EQ(found->depth, 10);
  EXPECT_EQ(found->orientation, 6);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
  EXPECT_EQ(found->thumbnail.size, (PixelSize{160, 120}));
  EXPECT_EQ(bytes.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
}

TEST(Heif, ThePropertiesOfThePrimaryItemAndItsExifAreRead) { expectTypical(typical().build()); }

TEST(Heif, TablesOfAllVersionsReadAlike) {
  for (unsigned locations : {0U, 1U, 2U}) {
    for (const bool isLong : {false, true}) {
      SCOPED_TRACE(testing::Message() << locations << isLong);
      expectTypical(typical({.locations = locations, .areIdentifiersLong = isLong}).build());
      expectTypical(typical({.locations = locations, .areAssociationsLong = isLong}).build());
    }
  }
}

TEST(Heif, ItemsCanLieBehindABaseInTheItemDataOrInExtents) {
  expectTypical(typical({.base = 100}).build());
  expectTypical(typical({}, HeifBytes::Where::itemData).build());
  expectTypical(typical({}, HeifBytes::Where::twoExtents).build());
}

TEST(Heif, AMetaBoxBehindThePicturesIsFound) {
  HeifBytes file = typical({.isMetaLast = true});
  file.item(4, "hvc1", std::string(500'000, 'x'));
  const std::string bytes = file.build();
  expectTypical(bytes);
  expectBounded(bytes);
}

TEST(Heif, BrandsDecideWhatAFileIs) {
  for (const auto* brand : {"heic", "heix", "mif1", "avif", "msf1", "hevc", "avis"})
    EXPECT_TRUE(readBasics(typical().build(brand))) << brand;
  EXPECT_TRUE(readBasics(typical().build("abcd"))) << "a compatible brand counts too";
  EXPECT_FALSE(readBasics(test::fileType("mp42", "isomqt  ") + box("moov", "")));
  EXPECT_FALSE(readBasics(box("moov", "heic")));
}

TEST(Heif, TurnsAreAnticlockwiseAndMirroringsExchangeTopAndBottomOrSides) {
  EXPECT_EQ(orientationWith({}), 1);
  EXPECT_EQ(orientationWith({turn(0)}), 1);
  EXPECT_EQ(orientationWith({turn(1)}), 8);
  EXPECT_EQ(orientationWith({turn(2)}), 3);
  EXPECT_EQ(orientationWith({turn(3)}), 6);
  EXPECT_EQ(orientationWith({mirror(0)}), 4);
  EXPECT_EQ(orientationWith({mirror(1)}), 2);
}

TEST(Heif, TurnsAndMirroringsApplyInTheOrderOfTheirAssociation) {
  EXPECT_EQ(orientationWith({turn(1), mirror(0)}), 5);
  EXPECT_EQ(orientationWith({mirror(0), turn(1)}), 7);
  EXPECT_EQ(orientationWith({turn(1), mirror(1)}), 7);
  EXPECT_EQ(orientationWith({mirror(1), turn(1)}), 5);
  EXPECT_EQ(orientationWith({turn(2), mirror(0)}), 2);
  EXPECT_EQ(orientationWith({mirror(0), turn(2)}), 2);
  EXPECT_EQ(orientationWith({turn(3), turn(3)}), 3);
}

/// A grey level for each corner of a picture: top left, top right, bottom right, bottom left.
using Corners = std::array<char, 4>;

TEST(Heif, EveryCombinationShowsWhatTheOrientationShows) {
  const auto turned = [](Corners c, unsigned n) {
    for (; n != 0; --n) c = {c[1], c[2], c[3], c[0]};  // anticlockwise: the right side comes to the top
    return c;
  };
  const auto mirrored = [](Corners c, unsigned axis) {
    return axis == 0 ? Corners{c[3], c[2], c[1], c[0]} : Corners{c[1], c[0], c[3], c[2]};
  };
  // EXIF 2.32: where the stored top left, top right, bottom right and bottom left are shown.
  const std::array<Corners, 9> shown{Corners{},
                                     {'a', 'b', 'c', 'd'},
                                     {'b', 'a', 'd', 'c'},
                                     {'c', 'd', 'a', 'b'},
                                     {'d', 'c', 'b', 'a'},
                                     {'a', 'd', 'c', 'b'},
                                     {'d', 'a', 'b', 'c'},
                                     {'c', 'b', 'a', 'd'},
                                     {'b', 'c', 'd', 'a'}};
  for (unsigned quarters = 0; quarters < 4; ++quarters) {
    for (unsigned axis = 0; axis < 2; ++axis) {
      EXPECT_EQ(shown.at(orientationWith({turn(quarters), mirror(axis)})),
                mirrored(turned({'a', 'b', 'c', 'd'}, quarters), axis));
      EXPECT_EQ(shown.at(orientationWith({mirror(axis), turn(quarters)})),
                turned(mirrored({'a', 'b', 'c', 'd'}, axis), quarters));
    }
  }
}

TEST(Heif, ExifDoesNotDecideHowAPictureIsShown) {
  HeifBytes file;
  file.item(1, "hvc1");
  file.item(2, "Exif", test::exifItem(exifBlock(6)));
  file.properties(1, {extents(640, 480)});
  for (const auto& found : {readBasics(file.build()), readAll(file.build()), readPreviews(file.build())})
    EXPECT_EQ(found->orientation, 1);
  EXPECT_EQ(readBasics(file.build())->entries.find(ExifGroup::tiff, "Orientation"), Value(6U));
}

TEST(Heif, TheExifThatDescribesThePictureIsTaken) {
  TiffBytes other;
  other.beginDirectory();
  other.ascii(0x010F, "Other");
  HeifBytes file;
  file.item(1, "hvc1");
  file.item(2, "Exif", test::exifItem(other.build()));
  file.item(3, "Exif", test::exifItem(exifBlock(), std::string_view("Exif\0\0", 6)));
  file.reference("cdsc", 2, {4});
  file.reference("cdsc", 3, {4, 1});
  EXPECT_EQ(readBasics(file.build())->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
}

TEST(Heif, ExifWhoseHeaderIsNotWhereItSaysIsLeftOut) {
  for (const std::uint32_t before : {1U, 0x7FFFFFFFU, 0xFFFFFFFFU}) {
    HeifBytes file;
    file.item(1, "hvc1");
    file.item(2, "Exif", big(before, 4) + exifBlock());
    file.properties(1, {extents(640, 480)});
    const auto found = readBasics(file.build());
    EXPECT_TRUE(found->entries.empty());
    EXPECT_EQ(found->size, (PixelSize{640, 480}));
  }
}

TEST(Heif, DepthComesFromTheDecoderWhenThePictureDoesNotSayIt) {
  const auto depthWith = [](const std::string& property) {
    HeifBytes file;
    file.item(1, "grid");
    file.item(2, "av01");
    file.properties(2, {property});
    file.reference("dimg", 1, {2, 3});
    return readBasics(file.build())->depth;
  };
  EXPECT_EQ(depthWith(box("hvcC", std::string(17, '\0') + "\xFA" + std::string(5, '\0'))), 10);
  EXPECT_EQ(depthWith(box("av1C", big(0x81004C00, 4))), 10);
  EXPECT_EQ(depthWith(box("av1C", big(0x81006C00, 4))), 12);
  EXPECT_EQ(depthWith(box("av1C", big(0x81000C00, 4))), 8);
  EXPECT_EQ(depthWith(channels(9)), 9);
  EXPECT_EQ(depthWith(box("hvcC", "short")), 0);
}

TEST(Heif, ThumbnailsAreEmbeddedPicturesOnlyWhenTheyAreJpegs) {
  HeifBytes file;
  file.item(1, "hvc1");
  file.item(2, "hvc1", jpeg(10, 10));
  file.item(3, "jpeg", jpeg(320, 240));
  file.item(4, "jpeg", "no picture");
  for (const std::uint32_t thumbnail : {2U, 3U, 4U}) file.reference("thmb", thumbnail, {1});
  const std::string bytes = file.build();
  const auto found = readPreviews(bytes);
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{320, 240}));
  EXPECT_EQ(bytes.substr(found->embedded[0].offset, found->embedded[0].length), jpeg(320, 240));
  // Where EXIF has no thumbnail, this is one.
  EXPECT_EQ(readBasics(bytes)->thumbnail.size, (PixelSize{320, 240}));
  EXPECT_TRUE(readBasics(bytes)->embedded.empty());
}

TEST(Heif, AJpegInSeveralPiecesIsNoEmbeddedPicture) {
  HeifBytes file;
  file.item(1, "hvc1");
  file.item(2, "jpeg", jpeg(320, 240), HeifBytes::Where::apart);
  file.reference("thmb", 2, {1});
  EXPECT_TRUE(readPreviews(file.build())->embedded.empty());
  EXPECT_FALSE(readPreviews(file.build())->thumbnail);
}

TEST(Heif, ASequenceHasTheSizeOfItsTrack) {
  const std::string bytes =
      test::fileType("msf1", "hevc") + box("moov", test::pictureTrack(256, 144)) + box("mdat", "pictures");
  EXPECT_EQ(readBasics(bytes)->size, (PixelSize{256, 144}));
  EXPECT_FALSE(*readBasics(test::fileType("msf1") + box("mdat", "pictures")));
}

TEST(Heif, AFileWithoutAPrimaryItemGivesNothing) {
  const std::string bytes = test::fileType("heic") + fullBox("meta", 0, 0, fullBox("iinf", 0, 0, big(0, 2)));
  ASSERT_TRUE(readBasics(bytes));
  EXPECT_FALSE(*readBasics(bytes));
}

TEST(Heif, ItemsOutsideTheFileAreLeftOut) {
  HeifBytes::Form form;
  form.base = ~0ULL - 1000;  // base and offset together would wrap around to the bytes
  HeifBytes file = typical(form);
  const std::string bytes = file.build();
  const auto found = readPreviews(bytes);
  EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
  EXPECT_TRUE(found->embedded.empty());
  EXPECT_FALSE(found->thumbnail);
}

TEST(Heif, TablesThatClaimMoreThanTheyHoldGiveWhatTheyHold) {
  const std::string meta = fullBox("pitm", 0, 0, big(1, 2));
  const std::string ipma = big(0xFFFFFFFF, 4) + big(9, 2) + big(0, 1) + big(1, 2) + big(2, 1);
  const std::string properties =
      box("iprp", box("ipco", extents(640, 480)) + fullBox("ipma", 0, 0, ipma + big(0x7F, 1) + big(1, 1)));
  const std::string iloc =
      fullBox("iloc", 2, 0, big(0, 2) + big(0xFFFFFFFF, 4) + big(2, 4) + big(0, 4) + big(0xFFFF, 2));
  const std::string iinf =
      fullBox("iinf", 1, 0, big(0xFFFFFFFF, 4) + fullBox("infe", 2, 0, big(2, 2) + big(0, 2) + "Exif"));
  const std::string iref = fullBox("iref", 0, 0, box("cdsc", big(2, 2) + big(0xFFFF, 2) + big(1, 2)));
  const std::string bytes =
      test::fileType("heic") + fullBox("meta", 0, 0, meta + properties + iloc + iinf + iref);
  EXPECT_EQ(readBasics(bytes)->size, (PixelSize{640, 480}));
  expectBounded(bytes);
}

TEST(Heif, ManyItemsAndPropertiesStayWithinBounds) {
  HeifBytes file({.areIdentifiersLong = true});
  file.item(1, "grid");
  file.properties(1, {extents(16384, 12288)});
  for (std::uint32_t id = 2; id < 800; ++id) {
    file.item(id, "hvc1", "tile");
    file.reference("dimg", 1, {id});
  }
  file.item(900, "Exif", test::exifItem(exifBlock()));
  const std::string bytes = file.build();
  EXPECT_EQ(readBasics(bytes)->size, (PixelSize{16384, 12288}));
  EXPECT_EQ(readBasics(bytes)->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  expectBounded(bytes);
}

TEST(Heif, ItemsAndThoseThatReferToThemAreListed) {
  HeifBytes file = typical();
  file.item(4, "hvc1");
  file.reference("thmb", 4, {7, 1});
  file.reference("dimg", 5, {1});
  const CountingSource source(file.build());
  Parse parse(source, Scope::basics);
  const HeifItems items(parse, childOf(parse, Box{.length = source.size()}, fourCharacters("meta")));
  std::vector<std::uint32_t> listed;
  for (const HeifItem& item : items.items()) listed.push_back(item.id);
  EXPECT_EQ(listed, (std::vector<std::uint32_t>{1, 2, 3, 4}));
  EXPECT_EQ(items.referringTo(fourCharacters("thmb"), 1), (std::vector<std::uint32_t>{3, 4}));
  EXPECT_EQ(items.referringTo(fourCharacters("thmb"), 7), (std::vector<std::uint32_t>{4}));
  EXPECT_TRUE(items.referringTo(fourCharacters("thmb"), 2).empty());
}

TEST(Heif, EveryCutOfAFileGivesWhatIsLeft) {
  const std::string bytes = typical().build();
  for (std::size_t length = 0; length < bytes.size(); ++length) expectBounded(bytes.substr(0, length));
}

TEST(Heif, NoByteThatIsDifferentLeadsOutOfTheFile) { expectBoundedWithOtherBytes(typical().build()); }

}  // namespace
}  // namespace brivo::images
