// SPDX-License-Identifier: MIT
// Raw files of real cameras, and one made by hand; what LibRaw makes of a file when it is asked for
// everything is the measure of what is developed.
#include <gtest/gtest.h>
#include <libraw/libraw.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <numeric>
#include <string>
#include <string_view>
#include <vector>

#include "corpus.h"
#include "file_source.h"
#include "imaging/decode_request.h"
#include "imaging/slice_source.h"
#include "support/image_bytes.h"
#include "support/temporary_folder.h"

namespace brivo::imaging {
namespace {

namespace fs = std::filesystem;
using images::Corpus;
using images::CorpusFile;
using images::FileSource;

constexpr std::uint32_t kPart = 16;
/// What a picture shows: red, green and blue, from 0 to 255, of 16 × 16 parts of it.
using Content = std::array<double, std::size_t{kPart} * kPart * 3>;

/// Pixels of red, green and blue, in rows of `stride` bytes.
Content contentOf(std::span<const std::uint8_t> pixels, std::uint32_t width, std::uint32_t height,
                  std::size_t stride) {
  Content sums{};
  std::array<double, sums.size()> counts{};
  for (std::uint32_t y = 0; y < height; ++y) {
    for (std::uint32_t x = 0; x < width; ++x) {
      const std::size_t part = (std::size_t{y} * kPart / height * kPart + std::size_t{x} * kPart / width) * 3;
      for (std::size_t c = 0; c < 3; ++c) {
        sums[part + c] += pixels[y * stride + std::size_t{x} * 3 + c];
        counts[part + c] += 1;
      }
    }
  }
  std::ranges::transform(sums, counts, sums.begin(), std::divides());
  return sums;
}

Content contentOf(const Picture& picture) {
  const AVFrame& frame = *picture.frame;
  EXPECT_EQ(frame.format, AV_PIX_FMT_RGB24);
  const auto height = static_cast<std::uint32_t>(frame.height);
  const auto stride = static_cast<std::size_t>(frame.linesize[0]);
  return contentOf({frame.data[0], stride * height}, static_cast<std::uint32_t>(frame.width), height, stride);
}

double meanDifference(const Content& one, const Content& other) {
  return std::transform_reduce(one.begin(), one.end(), other.begin(), 0.0, std::plus(),
                               [](double a, double b) { return std::abs(a - b); }) /
         static_cast<double>(one.size());
}

/// What LibRaw makes of a file by its own means.
struct Developed {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  Content content{};
};

Developed fullyDeveloped(const fs::path& path) {
  const auto raw = std::make_unique<LibRaw>();
  raw->imgdata.params.use_camera_wb = 1;
  raw->imgdata.params.user_flip = 0;
  EXPECT_EQ(raw->open_file(path.c_str()), LIBRAW_SUCCESS);
  EXPECT_EQ(raw->unpack(), LIBRAW_SUCCESS);
  EXPECT_EQ(raw->dcraw_process(), LIBRAW_SUCCESS);
  const std::unique_ptr<libraw_processed_image_t, void (*)(libraw_processed_image_t*)> image(
      raw->dcraw_make_mem_image(), LibRaw::dcraw_clear_mem);
  if (!image) return {};
  const std::size_t stride = std::size_t{3} * image->width;
  return {image->width, image->height,
          contentOf({&image->data[0], image->data_size}, image->width, image->height, stride)};
}

using Size = std::pair<int, int>;
Size sizeOf(const std::optional<Picture>& picture) {
  return picture ? Size(picture->frame->width, picture->frame->height) : Size();
}

/// The pixels without the padding of rows.
std::vector<std::uint8_t> pixelsOf(const Picture& picture) {
  std::vector<std::uint8_t> pixels;
  const AVFrame& frame = *picture.frame;
  for (std::ptrdiff_t y = 0; y < frame.height; ++y) {
    const std::uint8_t* row = frame.data[0] + frame.linesize[0] * y;
    pixels.insert(pixels.end(), row, row + frame.width);
  }
  return pixels;
}

constexpr auto kEmbedded = ThumbnailSource::embedded;
constexpr auto kEmbeddedElseFull = ThumbnailSource::embeddedElseFull;

class RawCorpus : public testing::Test {
 protected:
  void SetUp() override {
    if (!Corpus::find()) GTEST_SKIP() << "no corpus here";
  }

  static fs::path pathOf(const std::string& name) { return Corpus::find()->pathOf({name, {}}); }

  static std::optional<Picture> decode(const std::string& name, std::uint32_t maximumPixelSize,
                                       ThumbnailSource source = ThumbnailSource::full) {
    return decodeRaw(FileSource(pathOf(name)), {maximumPixelSize, source, {}});
  }
};

TEST_F(RawCorpus, TheNarrowestPreviewThatIsLargeEnoughServes) {
  const std::string name = "raw/mk-NIKON_D3300.NEF";  // holds one of 640 × 480 and one of 1600 × 1200
  EXPECT_EQ(sizeOf(decode(name, 640)), Size(640, 480));
  EXPECT_EQ(sizeOf(decode(name, 1600)), Size(1600, 1200));
  const auto between = decode(name, 641);
  ASSERT_TRUE(between);
  EXPECT_GT(between->frame->width, 640);
}

TEST_F(RawCorpus, WhatServesIsDecodedAsAnyOtherJpeg) {
  const FileSource file(pathOf("raw/mk-NIKON_D3300.NEF"));
  for (const std::uint32_t size : {100U, 640U}) {
    const auto served = decodeRaw(file, {size, ThumbnailSource::full, {}});
    const auto jpeg = decodeJpeg(SliceSource(file, 117'192, 18'168), {size, ThumbnailSource::full, {}});
    ASSERT_TRUE(served && jpeg);
    EXPECT_EQ(sizeOf(served), sizeOf(jpeg));
    EXPECT_EQ(pixelsOf(*served), pixelsOf(*jpeg));
  }
}

TEST_F(RawCorpus, APreviewAsLargeAsTheImageServesAnySize) {
  const std::string name = "raw/mk-Canon_EOS_70D.CR2";  // an image of 1600 × 1200
  EXPECT_EQ(sizeOf(decode(name, 0)), Size(1600, 1200));
  EXPECT_EQ(sizeOf(decode(name, 9000)), Size(1600, 1200));
}

TEST_F(RawCorpus, WhereNoPreviewIsLargeEnoughTheSensorIsDeveloped) {
  EXPECT_EQ(sizeOf(decode("raw/CRW_0304.CRW", 160)), Size(160, 120));
  EXPECT_EQ(sizeOf(decode("raw/CRW_0304.CRW", 1156)), Size(1156, 860));
  EXPECT_EQ(sizeOf(decode("raw/CRW_0304.CRW", 1157)), Size(2312, 1720));
  EXPECT_EQ(sizeOf(decode("raw/CRW_0304.CRW", 0)), Size(2312, 1720));
  EXPECT_EQ(sizeOf(decode("raw/td-colorchart.dng", 160)), Size(867, 578));
}

TEST_F(RawCorpus, WhatIsDevelopedShowsWhatLibRawShows) {
  for (const char* name : {"raw/CRW_0304.CRW", "raw/td-colorchart.dng", "raw/dc-DC120-P003912.KDC",
                           "raw/dc-DC50-DC0008L.KDC", "raw/dc-DC50-DC0010S.KDC"}) {
    const Developed reference = fullyDeveloped(pathOf(name));
    const Content black{};
    ASSERT_GT(meanDifference(reference.content, black), 20) << name;
    const auto full = decode(name, 0);
    const auto half = decode(name, std::min(reference.width, reference.height) / 2 - 20);
    ASSERT_TRUE(full && half) << name;
    EXPECT_EQ(sizeOf(full), Size(reference.width, reference.height)) << name;
    EXPECT_NEAR(half->frame->width, reference.width / 2.0, 1) << name;
    EXPECT_LT(meanDifference(contentOf(*full), reference.content), 2) << name;
    EXPECT_LT(meanDifference(contentOf(*half), reference.content), 4) << name;
  }
}

TEST_F(RawCorpus, ForWhatIsEmbeddedAnySizeServes) {
  EXPECT_EQ(sizeOf(decode("raw/mk-NIKON_D3300.NEF", 641, kEmbedded)),
            sizeOf(decode("raw/mk-NIKON_D3300.NEF", 641)));
  EXPECT_EQ(sizeOf(decode("raw/mk-NIKON_D3300.NEF", 3000, kEmbedded)), Size(1600, 1200));
  EXPECT_EQ(sizeOf(decode("raw/mk-NIKON_D3300.NEF", 0, kEmbedded)), Size(1600, 1200));
  EXPECT_EQ(sizeOf(decode("raw/dc-DC50-DC0008L.KDC", 160, kEmbedded)), Size(96, 64)) << "it is no JPEG";
  EXPECT_FALSE(decode("raw/td-colorchart.dng", 160, kEmbedded)) << "it holds none";
}

TEST_F(RawCorpus, WhereNothingIsEmbeddedTheSensorIsDeveloped) {
  EXPECT_EQ(sizeOf(decode("raw/mk-NIKON_D3300.NEF", 3000, kEmbeddedElseFull)), Size(1600, 1200));
  EXPECT_EQ(sizeOf(decode("raw/td-colorchart.dng", 160, kEmbeddedElseFull)), Size(867, 578));
}

TEST_F(RawCorpus, AnEmbeddedBitmapShowsTheScene) {
  const auto small = decode("raw/dc-DC50-DC0008L.KDC", 96, kEmbedded);
  ASSERT_TRUE(small);
  const Developed reference = fullyDeveloped(pathOf("raw/dc-DC50-DC0008L.KDC"));
  EXPECT_LT(meanDifference(contentOf(*small), reference.content), 40);
}

TEST_F(RawCorpus, OtherImagesAreNoRawFiles) {
  for (const char* name : {"tiff/pil-child_ifd_jpeg.tiff", "tiff/pil-child_ifd.tiff", "tiff/et-ExifTool.tif",
                           "jpeg/me-Nikon_D5000.jpg", "raw/me-Issue_247-4.nef", "png/ne-exif.png"}) {
    for (const auto source : {ThumbnailSource::full, kEmbedded})
      EXPECT_FALSE(decode(name, 16, source)) << name;
  }
}

TEST_F(RawCorpus, ALargeFileIsNotReadForItsPreview) {
  const test::TemporaryFolder folder;
  const std::string path = folder / "LARGE.NEF";
  fs::copy_file(pathOf("raw/mk-NIKON_D3300.NEF"), path);
  fs::permissions(path, fs::perms::owner_all);
  fs::resize_file(path, 50'000'000);
  const FileSource file(path);
  EXPECT_EQ(sizeOf(decodeRaw(file, {640, ThumbnailSource::full, {}})), Size(640, 480));
  EXPECT_LT(file.bytesAsked(), 400'000u);
  EXPECT_TRUE(file.stayedInside());
}

TEST_F(RawCorpus, SensorDataThatIsCutShortGivesNothing) {
  const std::string bytes = test::readFile(pathOf("raw/td-colorchart.dng"));
  for (const std::size_t length : {bytes.size() / 50, bytes.size() / 2, bytes.size() * 9 / 10}) {
    const images::MemorySource cut(std::as_bytes(std::span(bytes)).first(length));
    EXPECT_FALSE(decodeRaw(cut, {160, ThumbnailSource::full, {}})) << length;
  }
}

TEST_F(RawCorpus, SensorDataThatIsDamagedGivesNothing) {
  EXPECT_FALSE(decode("raw/mk-NIKON_D3300.NEF", 0)) << "it is noise";
  EXPECT_FALSE(decode("raw/et-Nikon-with-previews.nef", 0)) << "it is missing";
}

TEST_F(RawCorpus, APreviewBeforeTheCutStillServes) {
  const std::string bytes = test::readFile(pathOf("raw/mk-NIKON_D3300.NEF"));
  const images::MemorySource cut(std::as_bytes(std::span(bytes)).first(117'000));  // the smaller one is gone
  EXPECT_EQ(sizeOf(decodeRaw(cut, {1600, ThumbnailSource::full, {}})), Size(1600, 1200));
}

TEST_F(RawCorpus, HeadersMayEndAnywhere) {
  for (const char* name :
       {"raw/mk-NIKON_D3300.NEF", "raw/CRW_0304.CRW", "raw/bi-sample.arw", "raw/ne-canon-r6.cr3",
        "raw/mk-X-T20.RAF", "raw/et-Minolta.mrw", "raw/dc-DC50-DC0010S.KDC"}) {
    const std::string bytes = test::readFile(pathOf(name));
    for (std::size_t length = 0; length < std::min<std::size_t>(bytes.size(), 6000); length += 61) {
      const images::MemorySource cut(std::as_bytes(std::span(bytes)).first(length));
      const auto picture = decodeRaw(cut, {160, kEmbeddedElseFull, {}});
      EXPECT_TRUE(!picture || picture->frame) << name << " of " << length << " bytes";
    }
  }
}

TEST_F(RawCorpus, EveryFileGivesAPictureOrNothingSoon) {
  constexpr std::chrono::seconds kSoon(20);
  std::size_t files = 0;
  for (const CorpusFile& file : Corpus::find()->files()) {
    if (!file.name.starts_with("raw/") && !file.name.starts_with("malformed/")) continue;
    ++files;
    for (const ThumbnailRequest request : {ThumbnailRequest{160, ThumbnailSource::full, {}},
                                           ThumbnailRequest{0, kEmbedded, {}}, ThumbnailRequest()}) {
      const auto start = std::chrono::steady_clock::now();
      const auto picture = decodeRaw(FileSource(Corpus::find()->pathOf(file)), request);
      EXPECT_LT(std::chrono::steady_clock::now() - start, kSoon) << file.name;
      if (!picture) continue;
      EXPECT_TRUE(isWithinLimits(static_cast<std::uint64_t>(picture->frame->width),
                                 static_cast<std::uint64_t>(picture->frame->height)))
          << file.name;
    }
  }
  EXPECT_GT(files, 250u);
}

/// A DNG whose sensor sees red, with `given` bytes of its data.
std::string dng(unsigned width, unsigned height, std::size_t given) {
  test::TiffBytes tiff;
  tiff.beginDirectory();
  tiff.longs(0x00FE, {0});
  tiff.longs(0x0100, {width});
  tiff.longs(0x0101, {height});
  tiff.shorts(0x0102, {16});
  tiff.shorts(0x0103, {1});
  tiff.shorts(0x0106, {32803});
  tiff.ascii(0x010F, "Maker");
  tiff.ascii(0x0110, "Model");
  std::string data;
  for (std::size_t i = 0; i < given / 2; ++i) {
    const bool isRed = i / width % 2 == 0 && i % 2 == 0;
    data += test::integer(isRed ? 60'000 : 5'000, 2);
  }
  tiff.offsetOf(0x0111, data);
  tiff.shorts(0x0115, {1});
  tiff.longs(0x0116, {height});
  tiff.longs(0x0117, {std::uint64_t{width} * height * 2});
  tiff.shorts(0x828D, {2, 2});
  tiff.bytes(0x828E, {0, 1, 1, 2});
  tiff.bytes(0xC612, {1, 4, 0, 0});
  tiff.longs(0xC61D, {65'535});
  return tiff.build();
}

std::optional<Picture> decodeBytes(std::string_view bytes, std::uint32_t maximumPixelSize) {
  return decodeRaw(images::MemorySource(std::as_bytes(std::span(bytes))),
                   {maximumPixelSize, ThumbnailSource::full, {}});
}

TEST(RawDecoder, TheSensorIsDevelopedInTheSizeThatIsWanted) {
  const std::string file = dng(640, 480, 640 * 480 * 2);
  EXPECT_EQ(sizeOf(decodeBytes(file, 320)), Size(320, 240));
  EXPECT_EQ(sizeOf(decodeBytes(file, 321)), Size(640, 480));
  EXPECT_EQ(sizeOf(decodeBytes(file, 0)), Size(640, 480));
}

TEST(RawDecoder, TheColoursAreThoseOfTheFilterArray) {
  const auto picture = decodeBytes(dng(640, 480, 640 * 480 * 2), 320);
  ASSERT_TRUE(picture);
  const Content content = contentOf(*picture);
  EXPECT_GT(content[0], content[1] + 50);
  EXPECT_GT(content[0], content[2] + 50);
}

std::ptrdiff_t threadsOfThisProcess() { return std::distance(fs::directory_iterator("/proc/self/task"), {}); }

const std::ptrdiff_t kThreadsAtStart = threadsOfThisProcess();

TEST(RawDecoder, DevelopingStartsNoThread) {
  ASSERT_TRUE(decodeBytes(dng(640, 480, 640 * 480 * 2), 0));
  EXPECT_EQ(threadsOfThisProcess(), kThreadsAtStart) << "those that OpenMP starts stay";
}

TEST(RawDecoder, ASizeThatTheFileCannotHoldGivesNothing) {
  EXPECT_FALSE(decodeBytes(dng(30'000, 30'000, 1000), 160));
  EXPECT_FALSE(decodeBytes(dng(65'535, 65'535, 1000), 160));
  EXPECT_FALSE(decodeBytes(dng(640, 480, 640 * 480), 160));
}

TEST(RawDecoder, WhatIsNoFileGivesNothing) {
  EXPECT_FALSE(decodeBytes("", 160));
  EXPECT_FALSE(decodeBytes("no picture", 160));
  EXPECT_FALSE(decodeBytes(std::string(100'000, '\0'), 160));
}

}  // namespace
}  // namespace brivo::imaging
