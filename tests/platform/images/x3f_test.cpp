// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

#include <utility>
#include <vector>

#include "exif_bytes.h"
#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::exifSegment;
using test::exifWithThumbnail;
using test::integer;
using test::jpeg;

constexpr std::uint32_t kJpegFormat = 18, kRawFormat = 30;

struct Section {
  std::string type;
  std::string content;
};

Section image(std::uint32_t format, std::uint32_t width, std::uint32_t height, std::string_view data) {
  return {"IMA2", "SECi" + integer(0x00020000, 4) + integer(2, 4) + integer(format, 4) + integer(width, 4) +
                      integer(height, 4) + integer(0, 4) + std::string(data)};
}

Section properties(const std::vector<std::pair<std::string, std::string>>& list) {
  std::string entries, characters;
  const auto append = [&](const std::string& text) {
    entries += integer(characters.size() / 2, 4);
    for (const char character : text + '\0') characters += std::string(1, character) + '\0';
  };
  for (const auto& [name, value] : list) {
    append(name);
    append(value);
  }
  return {"PROP", "SECp" + integer(0x00020000, 4) + integer(list.size(), 4) + integer(0, 8) +
                      integer(characters.size() / 2, 4) + entries + characters};
}

std::string x3f(const std::vector<Section>& sections, std::uint32_t degrees = 0,
                std::uint32_t version = 0x00020002) {
  std::string file = "FOVb" + integer(version, 4);
  file.resize(version >> 16 >= 4 ? 40 : 28);
  file += integer(2640, 4) + integer(1760, 4) + integer(degrees, 4);
  std::string directory = "SECd" + integer(0x00020000, 4) + integer(sections.size(), 4);
  for (const auto& [type, content] : sections) {
    directory += integer(file.size(), 4) + integer(content.size(), 4) + type;
    file += content;
  }
  return file + directory + integer(file.size(), 4);
}

Section camera() {
  return properties(
      {{"ISO", "100"}, {"CAMMANUF", "SIGMA"}, {"CAMMODEL", "SIGMA SD10"}, {"TIME", "978309395"}});
}

std::string previewWithExif() {
  return jpeg(2640, 1760, exifSegment(exifWithThumbnail(std::endian::little, 8)));
}

TEST(X3f, SizeAndRotationComeFromTheHeader) {
  for (const std::uint32_t version : {0x00020002u, 0x00030000u, 0x00040001u}) {
    const auto found = readAll(x3f({}, 90, version));
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{2640, 1760}));
    EXPECT_EQ(found->crop, (PixelSize{2640, 1760}));
    EXPECT_EQ(found->orientation, 6);
  }
}

TEST(X3f, ThePropertyListNamesCameraAndTime) {
  const auto found = readAll(x3f({camera()}));
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("SIGMA"));
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Model"), Value("SIGMA SD10"));
  EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2001:01:01 00:36:35"));
}

TEST(X3f, ExifInThePreviewCountsBeforeThePropertyList) {
  const std::string file = x3f({image(kJpegFormat, 2640, 1760, previewWithExif()), camera()}, 90);
  const auto found = readAll(file);
  EXPECT_EQ(found->size, (PixelSize{2640, 1760}));
  EXPECT_EQ(found->depth, 0);
  EXPECT_EQ(found->orientation, 8);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  EXPECT_FALSE(found->entries.find(ExifGroup::tiff, "Model"));
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(160, 120));
}

TEST(X3f, ASmallJpegIsTheThumbnailWhereExifHasNone) {
  const std::string file = x3f({image(kJpegFormat, 2640, 1760, jpeg(2640, 1760) + std::string(100, 'd')),
                                image(kJpegFormat, 200, 150, jpeg(200, 150)), camera()});
  const auto found = readBasics(file);
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), jpeg(200, 150));
  EXPECT_FALSE(readBasics(x3f({image(kJpegFormat, 2640, 1760, jpeg(2640, 1760))}))->thumbnail);
}

TEST(X3f, JpegSectionsAndTheExifThumbnailAreEmbedded) {
  const std::string file =
      x3f({image(kRawFormat, 2640, 1760, std::string(1'000'000, 'r')),
           image(kJpegFormat, 2640, 1760, previewWithExif()), image(3, 200, 150, "uncompressed"),
           image(kJpegFormat, 200, 150, jpeg(200, 150)), camera()});
  expectSound(file);
  const auto found = readPreviews(file);
  EXPECT_EQ(found->orientation, 8);
  ASSERT_EQ(found->embedded.size(), 3u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{200, 150}));
  EXPECT_EQ(found->embedded[1].size, (PixelSize{160, 120}));
  EXPECT_EQ(found->embedded[2].size, (PixelSize{2640, 1760}));
  EXPECT_EQ(file.substr(found->embedded[2].offset, found->embedded[2].length), previewWithExif());
}

TEST(X3f, ASizeThatIsOutOfReachIsTheStatedOne) {
  std::string segments;
  for (int i = 0; i < 8; ++i) segments += test::jpegSegment(0xE2, std::string(60'000, 'p'));
  const auto found = readPreviews(x3f({image(kJpegFormat, 2640, 1760, jpeg(2000, 1000, segments))}));
  ASSERT_EQ(found->embedded.size(), 1u);
  EXPECT_EQ(found->embedded[0].size, (PixelSize{2640, 1760}));
}

TEST(X3f, BadPropertyListsGiveNothing) {
  Section otherFormat = camera();
  otherFormat.content[12] = 1;
  Section outside = camera();
  outside.content.replace(24 + 8, 24, 24, '\xFF');
  Section empty{"PROP", ""};
  for (const Section& section :
       {otherFormat, outside, empty, properties({{"TIME", "soon"}, {"CAMMANUF", ""}})})
    EXPECT_TRUE(readAll(x3f({section}))->entries.empty());
}

TEST(X3f, ADirectoryThatIsNoneGivesTheHeaderAlone) {
  std::string file = x3f({camera()});
  file.replace(file.size() - 4, 4, integer(0xFFFFFFF0, 4));
  const auto found = readAll(file);
  EXPECT_EQ(found->size, (PixelSize{2640, 1760}));
  EXPECT_TRUE(found->entries.empty());
}

TEST(X3f, SectionsThatAllCoverTheFileAreReadSoundly) {
  std::string file = x3f({image(kJpegFormat, 2640, 1760, previewWithExif())});
  const auto directory = static_cast<std::uint32_t>(file.size() - 4);
  file += "SECd" + integer(0, 4) + integer(1000, 4);
  for (int i = 0; i < 1000; ++i) file += integer(40, 4) + integer(directory - 40, 4) + "IMA2";
  expectSound(file + integer(directory, 4));
}

TEST(X3f, DamagedFilesAreReadSoundly) {
  const std::string file = x3f({image(kJpegFormat, 2640, 1760, previewWithExif()),
                                image(kJpegFormat, 200, 150, jpeg(200, 150)), camera()});
  expectCutsSound(file);
  expectHugeNumbersSound(file);
}

}  // namespace
}  // namespace brivo::images
