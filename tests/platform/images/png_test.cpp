// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <zlib.h>

#include "exif_bytes.h"
#include "sound_reading.h"

namespace brivo::images {
namespace {

using test::exifWithThumbnail;

std::string big(std::uint64_t value, std::size_t width) {
  return test::integer(value, width, std::endian::big);
}

std::string chunk(std::string_view type, std::string_view content) {
  return big(content.size(), 4) + std::string(type) + std::string(content) + big(0, 4);
}

std::string header(std::uint32_t width, std::uint32_t height, unsigned depth = 8) {
  return chunk("IHDR", big(width, 4) + big(height, 4) + big(depth, 1) + big(2, 1) + big(0, 3));
}

std::string png(std::string_view chunks) {
  return "\x89PNG\r\n\x1A\n" + std::string(chunks) + chunk("IEND", "");
}

/// A raw profile as text, `lineLength` digits to a line.
std::string profile(std::string_view keyword, std::string_view bytes, std::size_t lineLength = 72) {
  std::string text = std::string(keyword) + '\0' + "\nexif\n    " + std::to_string(bytes.size());
  std::size_t digits = 0;
  for (const char byte : bytes) {
    if (digits++ % (lineLength / 2) == 0) text += '\n';
    const auto value = static_cast<unsigned char>(byte);
    text += "0123456789abcdef"[value >> 4];
    text += "0123456789abcdef"[value & 15];
  }
  return text + '\n';
}

/// The same with everything behind the keyword in a zlib stream.
std::string compressedProfile(std::string_view keyword, std::string_view bytes) {
  const std::string plain = profile(keyword, bytes).substr(keyword.size() + 1);
  std::string stream(::compressBound(plain.size()), '\0');
  uLongf length = stream.size();
  EXPECT_EQ(::compress(reinterpret_cast<Bytef*>(stream.data()), &length,
                       reinterpret_cast<const Bytef*>(plain.data()), plain.size()),
            Z_OK);
  return std::string(keyword) + '\0' + '\0' + stream.substr(0, length);
}

TEST(Png, SizeAndDepthComeFromTheHeader) {
  const auto found = readBasics(png(header(4000, 3000, 16) + chunk("IDAT", "data")));
  ASSERT_TRUE(found);
  EXPECT_EQ(found->size, (PixelSize{4000, 3000}));
  EXPECT_EQ(found->depth, 16);
  EXPECT_EQ(found->orientation, 0);
}

TEST(Png, ExifIsReadBeforeAndBehindTheData) {
  const std::string exif = chunk("eXIf", exifWithThumbnail(std::endian::big));
  for (const std::string& file : {png(header(10, 20) + exif + chunk("IDAT", "data")),
                                  png(header(10, 20) + chunk("IDAT", std::string(100'000, 'd')) + exif)}) {
    const auto found = readBasics(file);
    ASSERT_TRUE(found);
    EXPECT_EQ(found->size, (PixelSize{10, 20}));
    EXPECT_EQ(found->orientation, 6);
    EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
    EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), test::jpeg(160, 120));
  }
}

TEST(Png, ACompressedProfileGivesItsEntriesAndNoThumbnail) {
  const std::string text = compressedProfile("Raw profile type exif", exifWithThumbnail(std::endian::little));
  const auto found = readBasics(png(header(10, 20) + chunk("zTXt", text)));
  EXPECT_EQ(found->orientation, 6);
  EXPECT_EQ(found->entries.find(ExifGroup::tiff, "Make"), Value("Maker"));
  EXPECT_FALSE(found->thumbnail) << "it has no place in the file";
}

TEST(Png, ACompressedProfileThatIsDamagedOrHasNoEndIsNone) {
  const std::string whole =
      compressedProfile("Raw profile type exif", exifWithThumbnail(std::endian::little));
  for (std::size_t length = 22; length < whole.size(); length += 3) {
    EXPECT_EQ(readBasics(png(header(10, 20) + chunk("zTXt", whole.substr(0, length))))->orientation, 0)
        << length;
  }
  const std::string bomb = compressedProfile("Raw profile type exif", std::string(10'000'000, '\0'));
  EXPECT_EQ(readBasics(png(header(10, 20) + chunk("zTXt", bomb)))->orientation, 0);
}

TEST(Png, ExifMayHaveTheSignatureThatItHasInJpeg) {
  const std::string exif = std::string("Exif\0\0", 6) + exifWithThumbnail(std::endian::little);
  const std::string file = png(header(10, 20) + chunk("eXIf", exif));
  const auto found = readBasics(file);
  EXPECT_EQ(found->orientation, 6);
  EXPECT_EQ(file.substr(found->thumbnail.offset, found->thumbnail.length), test::jpeg(160, 120));
}

TEST(Png, ARawProfileAsTextGivesEntriesAndNoThumbnail) {
  const std::string exif = std::string("Exif\0\0", 6) + exifWithThumbnail(std::endian::little);
  for (const std::string& text :
       {profile("Raw profile type exif", exif), profile("Raw profile type APP1", exif),
        profile("Raw profile type exif", exif, 20)}) {
    const auto found = readBasics(png(header(10, 20) + chunk("tEXt", text)));
    EXPECT_EQ(found->orientation, 6);
    EXPECT_EQ(found->entries.find(ExifGroup::exif, "DateTimeOriginal"), Value("2021:06:01 10:00:00"));
    EXPECT_FALSE(found->thumbnail);
  }
}

TEST(Png, OtherTextIsNoExif) {
  const std::string exif = exifWithThumbnail(std::endian::little);
  for (const std::string& text :
       {profile("Raw profile type iptc", exif), profile("Comment", exif),
        std::string("Raw profile type exif"), std::string("Raw profile type exif\0", 22),
        std::string("Raw profile type exif\0\nexif\n5\n", 30)}) {
    const auto found = readBasics(png(header(10, 20) + chunk("tEXt", text)));
    EXPECT_EQ(found->size, (PixelSize{10, 20}));
    EXPECT_TRUE(found->entries.empty());
  }
}

TEST(Png, AnOverlongProfileIsLeftOut) {
  std::string text = profile("Raw profile type exif", exifWithThumbnail(std::endian::little));
  text += std::string(200'000, ' ');
  const CountingSource source(png(header(10, 20) + chunk("tEXt", text)));
  EXPECT_TRUE(copySequentialProperties(source)->entries.empty());
  EXPECT_LE(source.bytesRead(), 32'768u);
}

TEST(Png, NothingBehindTheEndCounts) {
  EXPECT_EQ(readBasics(png(header(10, 20)) + chunk("eXIf", exifWithThumbnail(std::endian::big)))->orientation,
            0);
}

TEST(Png, DataWithoutEndAreGivenUp) {
  std::string data;
  for (int i = 0; i < 1000; ++i) data += chunk("IDAT", std::string(8192, 'd'));
  expectSound(png(header(10, 20) + data), kForHeadersInARow);
}

TEST(Png, ALengthPastTheEndEndsTheReading) {
  const std::string exif = exifWithThumbnail(std::endian::big);
  const std::string file = png(header(10, 20)).substr(0, 33) + big(0xFFFFFFFF, 4) + "eXIf" + exif;
  EXPECT_EQ(readBasics(file)->orientation, 6);
  EXPECT_EQ(readBasics(png(header(10, 20)).substr(0, 33) + big(0xFFFFFFFF, 4) + "IDAT" + exif)->orientation,
            0);
}

TEST(Png, DamagedFilesAreReadSoundly) {
  const std::string exif = exifWithThumbnail(std::endian::little);
  for (const std::string& file :
       {png(header(10, 20) + chunk("eXIf", exif)),
        png(header(10, 20) + chunk("tEXt", profile("Raw profile type exif", exif)))}) {
    expectCutsSound(file, kForHeadersInARow);
    expectHugeNumbersSound(file, kForHeadersInARow);
  }
}

}  // namespace
}  // namespace brivo::images
