// SPDX-License-Identifier: MIT
#include "platform/images/exif.h"

#include <gtest/gtest.h>

#include "reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::integer;
using test::jpeg;
using test::TiffBytes;
using namespace std::string_literals;

std::string pictureWith(const TiffBytes& exif) { return jpeg(10, 20, exifSegment(exif.build())); }

/// A picture with a maker note.
std::string pictureWithNote(std::string_view note) {
  TiffBytes tiff(std::endian::big);
  tiff.beginDirectory();
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.undefined(0x927C, note);
  return pictureWith(tiff);
}

/// A maker note that is a directory by itself: `header` ends with the version, and offsets count from its
/// start.
std::string dictionaryNote(std::endian order, std::string header) {
  header += order == std::endian::little ? "II" : "MM";
  TiffBytes tiff(order);
  tiff.beginDirectory();
  tiff.longs(1, {12});
  tiff.ascii(21, "text of some length");
  tiff.raw(8, 10, 3,
           integer(1, 4, order) + integer(2, 4, order) + integer(0xFFFFFFFF, 4, order) +
               integer(4, 4, order) + integer(0, 4, order) + integer(1, 4, order));
  return header + tiff.build(42, header.size() - 8).substr(header.size());
}

Dictionary noteEntries(std::string_view note) {
  return readBasics(pictureWithNote(note))->entries.dictionary(ExifGroup::makerNote);
}

TEST(Exif, EntriesGoIntoTheirGroups) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  tiff.ascii(0x9003, "2021:06:01 10:00:00");  // of EXIF, in the directory of TIFF
  tiff.directory(0x8769, 1);
  tiff.directory(0x8825, 2);
  tiff.beginDirectory();
  tiff.ascii(0x9004, "2021:06:01 10:00:01");
  tiff.beginDirectory();
  tiff.rationals(0x0002, {{50, 1}, {30, 1}, {0, 1}});
  const auto found = readAll(pictureWith(tiff));
  EXPECT_EQ(found->entries.dictionary(ExifGroup::tiff), (Dictionary{{"Make", "Maker"}}));
  EXPECT_EQ(found->entries.dictionary(ExifGroup::exif),
            (Dictionary{{"DateTimeDigitized", "2021:06:01 10:00:01"},
                        {"DateTimeOriginal", "2021:06:01 10:00:00"}}));
  EXPECT_EQ(found->entries.dictionary(ExifGroup::gps),
            (Dictionary{{"Latitude", Array{Value(50.0), Value(30.0), Value(0.0)}}}));
}

TEST(Exif, TheDirectoryOfExifComesBeforeEntriesOutsideIt) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x9003, "outside");
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.ascii(0x9003, "inside");
  EXPECT_EQ(readAll(pictureWith(tiff))->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("inside"));
}

TEST(Exif, DirectoriesThatNameEachOtherEnd) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  tiff.directory(0x8769, 0);
  tiff.directory(0x8825, 0);
  tiff.link(0, 0);
  for (const auto& found : {readAll(pictureWith(tiff)), readPreviews(pictureWith(tiff))}) {
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{10, 20}));
  }
}

TEST(Exif, OrientationIsReadFromAnyIntegerType) {
  const auto orientation = [](std::uint16_t type, std::string value, std::uint64_t count = 1) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.raw(0x0112, type, count, std::move(value));
    return readBasics(pictureWith(tiff))->orientation;
  };
  EXPECT_EQ(orientation(3, integer(6, 2)), 6);
  EXPECT_EQ(orientation(4, integer(6, 4)), 6);
  EXPECT_EQ(orientation(1, integer(6, 1)), 6);
  EXPECT_EQ(orientation(3, integer(6, 2) + integer(3, 2), 2), 6);
  EXPECT_EQ(orientation(3, integer(0, 2)), 1);
  EXPECT_EQ(orientation(3, integer(9, 2)), 1);
  EXPECT_EQ(orientation(4, integer(0xFFFFFFFF, 4)), 1);
  EXPECT_EQ(orientation(2, "6"), 0) << "text states none";
  EXPECT_EQ(orientation(3, "", 0), 0);
}

TEST(Exif, AMakerNoteThatIsADirectoryByItselfIsRead) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    for (const auto& header : {"Some iOS\0\0\1"s, "Signature\0\0\1"s, "S\0\0\0\0\0\0\0\0\0\0\1"s}) {
      const Dictionary entries = noteEntries(dictionaryNote(order, header));
      EXPECT_EQ(entries, (Dictionary{{"1", std::uint32_t{12}},
                                     {"21", "text of some length"},
                                     {"8", Array{Value(0.5), Value(-0.25), Value(0.0)}}}))
          << header.size();
    }
  }
}

TEST(Exif, OtherMakerNotesGiveNoEntries) {
  for (const std::string& header : {"Signature\0\0\2"s, "Signature\1"s, "\0\0\0\0\0\0\0\0\0\1"s,
                                    "Signature\0\1"s, "Signat\xC3\xA9\0\0\1"s}) {
    const Dictionary entries = noteEntries(dictionaryNote(std::endian::big, header));
    EXPECT_TRUE(entries.empty()) << header;
  }
  std::string noMark = dictionaryNote(std::endian::big, "Signature\0\0\1"s);
  noMark[12] = 'X';
  EXPECT_TRUE(noteEntries(noMark).empty());
  EXPECT_TRUE(noteEntries("").empty());
  EXPECT_TRUE(noteEntries("Signature").empty());
  EXPECT_TRUE(noteEntries("Signature\0\0\1"s).empty());
  EXPECT_TRUE(noteEntries("Signature\0\0\1MM"s).empty());
}

TEST(Exif, EveryCutOfAMakerNoteGivesTheEntriesThatAreThere) {
  const std::string note = dictionaryNote(std::endian::big, "Signature\0\0\1"s);
  std::size_t most = 0;
  for (std::size_t length = 0; length <= note.size(); ++length) {
    const std::size_t count = noteEntries(note.substr(0, length)).size();
    EXPECT_GE(count, most) << length;
    most = std::max(most, count);
  }
  EXPECT_EQ(most, 3u);
}

TEST(Exif, ValuesOutsideAMakerNoteAreLeftOut) {
  TiffBytes tiff(std::endian::big);
  tiff.beginDirectory();
  tiff.raw(1, 2, 20, integer(0xFFFFFFF0, 4, std::endian::big));
  tiff.raw(2, 2, 0xFFFFFFFF, integer(14, 4, std::endian::big));
  tiff.shorts(3, {5});
  const std::string header = "Signature\0\0\1MM"s;
  const std::string note = header + tiff.build(42, header.size() - 8).substr(header.size());
  EXPECT_EQ(noteEntries(note), (Dictionary{{"3", std::uint32_t{5}}}));
}

TEST(Exif, AMakerNoteOfFourGigabytesIsReadAsFarAsTheFileGoes) {
  const std::string note = dictionaryNote(std::endian::big, "Signature\0\0\1"s);
  for (const std::uint64_t length : {std::uint64_t{0xFFFFFFFF}, ~std::uint64_t{0}}) {
    CountingSource source(note);
    Parse parse(source, Scope::all);
    readMakerNoteDictionary(parse, 0, length);
    EXPECT_EQ(parse.found.entries.dictionary(ExifGroup::makerNote).size(), 3u);
    EXPECT_EQ(source.reads(), 1u);
  }
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.raw(0x927C, 7, 0xFFFFFFFF, integer(8, 4));
  EXPECT_TRUE(readAll(pictureWith(tiff))->entries.empty());
}

TEST(Exif, AMakerNoteBehindTheFileIsNone) {
  CountingSource source("short");
  Parse parse(source, Scope::all);
  readMakerNoteDictionary(parse, ~0ULL, ~0ULL);
  readMakerNoteDictionary(parse, 5, 100);
  EXPECT_TRUE(parse.found.entries.empty());
}

TEST(Exif, EveryChangedByteOfABlockIsBorne) {
  TiffBytes tiff(std::endian::big);
  tiff.beginDirectory();
  tiff.ascii(0x010F, "Maker");
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.undefined(0x927C, dictionaryNote(std::endian::little, "Signature\0\0\1"s));
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, jpeg(160, 120));
  const std::string file = pictureWith(tiff);
  for (std::size_t i = 12; i < file.size(); ++i) {
    for (const char byte : {'\0', '\x7F', '\xFF'}) {
      std::string changed = file;
      changed[i] = byte;
      const auto found = readAll(changed);
      ASSERT_TRUE(found);
      EXPECT_LE(found->thumbnail.offset + found->thumbnail.length, file.size());
      EXPECT_LE(found->orientation, 8);
      EXPECT_LE(found->entries.packed().size(), ExifEntries::kMostBytes);
    }
  }
}

}  // namespace
}  // namespace brivo::images
