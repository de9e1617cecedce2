// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <functional>

#include "platform/images/maker_previews.h"
#include "reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::jpeg;
using test::TiffBytes;
using namespace std::string_literals;

const std::string kPreview = jpeg(640, 480);
const std::string kSecond = jpeg(320, 240);

/// EXIF with a maker note, which `note` makes for the place at which it will lie.
std::string exifWithNote(std::string_view make, std::endian order,
                         const std::function<std::string(std::size_t)>& note) {
  const auto build = [&](const std::string& content) {
    TiffBytes tiff(order);
    tiff.beginDirectory();
    tiff.ascii(0x010F, make);
    tiff.directory(0x8769, 1);
    tiff.beginDirectory();
    tiff.undefined(0x927C, content);
    return tiff.build();
  };
  const std::string draft = note(100);
  return build(note(build(draft).size() - draft.size()));
}

/// A JPEG file with that EXIF.
std::string fileWithNote(std::string_view make, std::endian order,
                         const std::function<std::string(std::size_t)>& note) {
  return jpeg(4000, 3000, exifSegment(exifWithNote(make, order, note)));
}

/// `signature`, and the directories of `tiff`, whose offsets count from `place` bytes before the signature.
std::string noteFrom(const TiffBytes& tiff, std::string_view signature, std::size_t place) {
  constexpr std::size_t kTiffHeader = 8;
  return std::string(signature) +
         tiff.build(42, place + signature.size() - kTiffHeader).substr(place + signature.size());
}

/// The bytes of all previews of a file.
std::vector<std::string> previewsIn(const std::string& file) {
  const auto found = readPreviews(file);
  std::vector<std::string> previews;
  for (const EmbeddedImage& image : found->embedded)
    previews.push_back(file.substr(image.offset, image.length));
  return previews;
}

TiffBytes pair(std::endian order, std::uint16_t offsetTag, std::uint16_t lengthTag) {
  TiffBytes tiff(order);
  tiff.beginDirectory();
  tiff.placed(offsetTag, lengthTag, kPreview);
  return tiff;
}

TiffBytes inner(std::endian order, std::uint16_t directoryTag, std::uint16_t offsetTag,
                std::uint16_t lengthTag) {
  TiffBytes tiff(order);
  tiff.beginDirectory();
  tiff.directory(directoryTag, 1);
  tiff.beginDirectory();
  tiff.placed(offsetTag, lengthTag, kPreview);
  return tiff;
}

/// A little-endian directory with a LONG under each tag.
std::string directoryOf(std::initializer_list<std::pair<std::uint16_t, std::uint64_t>> entries) {
  std::string directory = test::integer(entries.size(), 2);
  for (const auto& [tag, value] : entries)
    directory += test::integer(tag, 2) + test::integer(4, 2) + test::integer(1, 4) + test::integer(value, 4);
  return directory + test::integer(0, 4);
}

struct Case {
  const char* what;
  std::string_view make;
  std::string signature;
  bool fromNote;  ///< offsets count from the note, not from the EXIF block
  TiffBytes (*directories)(std::endian);
};

const Case kCases[] = {
    {"Nikon without a signature", "NIKON", "", false,
     [](std::endian order) { return inner(order, 0x0011, 0x0201, 0x0202); }},
    {"Olympus, old", "OLYMPUS OPTICAL CO.,LTD", "OLYMP\0\1\0"s, false,
     [](std::endian order) { return pair(order, 0x0088, 0x0089); }},
    {"Olympus, old, camera settings", "OLYMPUS", "OLYMP\0\2\0"s, false,
     [](std::endian order) { return inner(order, 0x2020, 0x0101, 0x0102); }},
    {"Olympus, new", "OLYMPUS", "OLYMPUS\0II\3\0"s, true,
     [](std::endian order) { return inner(order, 0x2020, 0x0101, 0x0102); }},
    {"OM System", "OM Digital Solutions", "OM SYSTEM\0\0\0II\4\0"s, true,
     [](std::endian order) { return inner(order, 0x2020, 0x0101, 0x0102); }},
    {"Pentax", "PENTAX Corporation", "AOC\0MM"s, false,
     [](std::endian order) { return pair(order, 0x0004, 0x0003); }},
    {"Casio", "CASIO", "QVC\0\0\0"s, false, [](std::endian order) { return pair(order, 0x0004, 0x0003); }},
    {"Casio, old", "CASIO", "", false, [](std::endian order) { return pair(order, 0x0004, 0x0003); }},
    {"Minolta", "Minolta Co., Ltd.", "", false,
     [](std::endian order) { return pair(order, 0x0088, 0x0089); }},
    {"Konica Minolta", "KONICA MINOLTA", "", false,
     [](std::endian order) { return pair(order, 0x0088, 0x0089); }},
};

TEST(MakerPreviews, EachMakerNamesThemInItsOwnWay) {
  for (const Case& each : kCases) {
    for (const auto order : {std::endian::little, std::endian::big}) {
      const std::string file = fileWithNote(each.make, order, [&](std::size_t place) {
        return noteFrom(each.directories(order), each.signature, each.fromNote ? 0 : place);
      });
      EXPECT_EQ(previewsIn(file), (std::vector{kPreview})) << each.what;
    }
  }
}

TEST(MakerPreviews, AnotherMakersNoteGivesNone) {
  const std::string file = fileWithNote("Somebody", std::endian::little, [](std::size_t place) {
    return noteFrom(pair(std::endian::little, 0x0088, 0x0089), "", place);
  });
  EXPECT_TRUE(previewsIn(file).empty());
}

TEST(MakerPreviews, NikonCountsFromATiffHeaderInTheNote) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const std::string file = fileWithNote("NIKON CORPORATION", std::endian::little, [&](std::size_t) {
      return "Nikon\0\2\x10\0\0"s + inner(order, 0x0011, 0x0201, 0x0202).build();
    });
    EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
  }
}

TEST(MakerPreviews, TheNewNotesOfPentaxCountThePreviewFromTheExifBlock) {
  const std::string file = fileWithNote("PENTAX", std::endian::big, [](std::size_t place) {
    TiffBytes tiff(std::endian::big);
    tiff.beginDirectory();
    tiff.longs(0x0003, {kPreview.size()});
    tiff.longs(0x0004, {place + 40});
    std::string note = noteFrom(tiff, "PENTAX \0MM"s, 0);
    note.resize(40, '\0');
    return note + kPreview;
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
}

TEST(MakerPreviews, CanonNamesThemInAnArray) {
  const std::string file = fileWithNote("Canon", std::endian::little, [](std::size_t place) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.longs(0x00B6, {24, 2, kPreview.size(), 640, 480, place + 60});
    std::string note = noteFrom(tiff, "", place);
    note.resize(60, '\0');
    return note + kPreview;
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
}

TEST(MakerPreviews, AValueMayBeThePreview) {
  const std::string file = fileWithNote("OLYMPUS", std::endian::little, [](std::size_t) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.undefined(0x0100, kPreview);
    tiff.undefined(0x0280, kSecond);
    return noteFrom(tiff, "OLYMPUS\0II\3\0"s, 0);
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview, kSecond}));
}

TEST(MakerPreviews, AValueMayBeTheDirectory) {
  const std::string settings = directoryOf({{0x0101, 90}, {0x0102, kPreview.size()}});
  const std::string file = fileWithNote("OLYMPUS", std::endian::little, [&](std::size_t) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.undefined(0x2020, settings);
    std::string note = noteFrom(tiff, "OLYMPUS\0II\3\0"s, 0);
    note.resize(90, '\0');
    return note + kPreview;
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
}

TEST(MakerPreviews, SamsungCountsFromADirectoryWithoutASignature) {
  const std::string file = fileWithNote("SAMSUNG", std::endian::big, [](std::size_t) {
    return directoryOf({{0x0035, 18}}) + directoryOf({{0x0201, 48}, {0x0202, kPreview.size()}}) + kPreview;
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
}

TEST(MakerPreviews, ANoteMayBeNothingButThePreview) {
  EXPECT_EQ(previewsIn(fileWithNote("Somebody", std::endian::little, [](std::size_t) { return kPreview; })),
            (std::vector{kPreview}));
}

TEST(MakerPreviews, APreviewMayLieBehindTheImage) {
  const auto file = [](std::size_t offset) {
    return fileWithNote("Minolta", std::endian::little, [&](std::size_t place) {
      TiffBytes tiff;
      tiff.beginDirectory();
      tiff.longs(0x0088, {offset});
      tiff.longs(0x0089, {kPreview.size()});
      return noteFrom(tiff, "", place);
    });
  };
  constexpr std::size_t kExifStart = 12;
  EXPECT_EQ(previewsIn(file(file(0).size() - kExifStart) + kPreview), (std::vector{kPreview}));
}

TEST(MakerPreviews, TheOrderWithFewerEntriesCountsWhateverIsMarked) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const std::string file = fileWithNote("PENTAX", std::endian::little, [&](std::size_t place) {
      return noteFrom(pair(order, 0x0004, 0x0003), "AOC\0MM"s, place);
    });
    EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
  }
}

TEST(MakerPreviews, ANoteThatIsNoDirectoryDoesNotUseUpTheParse) {
  TiffBytes tiff;
  tiff.beginDirectory();
  tiff.ascii(0x010F, "NIKON");
  tiff.directory(0x8769, 1);
  tiff.beginDirectory();
  tiff.undefined(0x927C, "Nikon\0\1 and no directory"s);
  tiff.link(0, tiff.beginDirectory());
  tiff.placed(0x0201, 0x0202, kSecond);
  CountingSource source(jpeg(10, 20, exifSegment(tiff.build())) + std::string(500'000, 'x'));
  const auto found = copyContainerProperties(source);
  EXPECT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->size, (PixelSize{10, 20}));
  EXPECT_EQ(source.reads(), 1u);
}

TEST(MakerPreviews, WhatIsNoJpegOrLeavesTheFileIsLeftOut) {
  const auto previews = [](std::uint64_t offset, std::uint64_t length) {
    return previewsIn(fileWithNote("CASIO", std::endian::big, [&](std::size_t place) {
      TiffBytes tiff(std::endian::big);
      tiff.beginDirectory();
      tiff.longs(0x0004, {offset});
      tiff.longs(0x0003, {length});
      return noteFrom(tiff, "QVC\0\0\0"s, place);
    }));
  };
  EXPECT_TRUE(previews(0, 10).empty());
  EXPECT_TRUE(previews(0xFFFFFFFF, 0xFFFFFFFF).empty());
  EXPECT_TRUE(previews(0xFFFFFFF4, 0x20).empty());
}

TEST(MakerPreviews, ADirectoryInItselfEnds) {
  const std::string file = fileWithNote("OLYMPUS", std::endian::little, [](std::size_t) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.directory(0x2020, 0);
    tiff.placed(0x0088, 0x0089, kPreview);
    return noteFrom(tiff, "OLYMPUS\0II\3\0"s, 0);
  });
  EXPECT_EQ(previewsIn(file), (std::vector{kPreview}));
}

TEST(MakerPreviews, RawFilesHaveThemToo) {
  for (const auto order : {std::endian::little, std::endian::big}) {
    const std::string raw = exifWithNote("PENTAX", order, [&](std::size_t place) {
      return noteFrom(pair(order, 0x0004, 0x0003), "AOC\0MM"s, place);
    });
    EXPECT_EQ(previewsIn(raw), (std::vector{kPreview}));
  }
}

TEST(MakerPreviews, ANoteThatWasMovedIntoADngCountsFromItsOldPlace) {
  const std::string note = "Nikon\0\2\x10\0\0"s + inner(std::endian::big, 0x0011, 0x0201, 0x0202).build();
  const auto previews = [&](std::uint64_t length, std::string_view signature) {
    TiffBytes tiff;
    tiff.beginDirectory();
    tiff.ascii(0x010F, "NIKON CORPORATION");
    tiff.undefined(0xC634, std::string(signature) + test::integer(length, 4, std::endian::big) + "MM" +
                               test::integer(34'096, 4, std::endian::big) + note);
    return previewsIn(tiff.build());
  };
  EXPECT_EQ(previews(note.size() + 6, "Adobe\0MakN"s), (std::vector{kPreview}));
  EXPECT_EQ(previews(0xFFFFFFFF, "Adobe\0MakN"s), (std::vector{kPreview}));
  EXPECT_TRUE(previews(0, "Adobe\0MakN"s).empty());
  EXPECT_TRUE(previews(note.size() + 6, "Other\0MakN"s).empty());
}

TEST(MakerPreviews, EveryCutAndEveryChangedByteOfANoteIsBorne) {
  const std::string file = fileWithNote("OLYMPUS", std::endian::little, [](std::size_t) {
    return noteFrom(inner(std::endian::little, 0x2020, 0x0101, 0x0102), "OLYMPUS\0II\3\0"s, 0);
  });
  for (std::size_t i = 2; i < file.size(); ++i) {
    for (const char byte : {'\0', '\x7F', '\xFF'}) {
      std::string changed = file;
      changed[i] = byte;
      for (const std::string& preview : previewsIn(changed)) EXPECT_EQ(preview.substr(0, 2), "\xFF\xD8");
    }
    for (const std::string& preview : previewsIn(file.substr(0, i)))
      EXPECT_EQ(preview.substr(0, 2), "\xFF\xD8");
  }
}

}  // namespace
}  // namespace brivo::images
