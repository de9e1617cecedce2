// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cstddef>
#include <filesystem>
#include <fstream>
#include <span>

#include "imaging/decode_request.h"
#include "iso_bytes.h"

namespace brivo::imaging {
namespace {

using test::big;
using test::box;
using test::extents;
using test::HeifBytes;

std::string bytesOf(std::string_view hexadecimal) {
  std::string bytes;
  for (std::size_t i = 0; i + 1 < hexadecimal.size(); i += 2)
    bytes += static_cast<char>(std::stoi(std::string(hexadecimal.substr(i, 2)), nullptr, 16));
  return bytes;
}

// Pictures of 64 × 64 in one grey, whose luma is their name.
const std::string kConfiguration =
    box("hvcC",
        bytesOf("0103700000000000000000001ef000fcfdf8f800000f03200001001840010c01ffff037000000300900000030000"
                "03001eba0240210001002b42010103700000030090000003000003001ea020810596ea4929ae6e04040c08000003"
                "000800000300084022000100074401c172b02240"));
const std::string kDark60 = bytesOf("000000122801af1380e6c86853ffff7d555e51868e60");
const std::string kLight180 = bytesOf("000000122801af1380e6c86853ea1f5e3ade51868e60");
const std::string kAv1Configuration = box("av1C", bytesOf("81000c00"));
const std::string kAv1Dark60 = bytesOf("12000a0918157ffd8204040d08320f18000a28a28400b4db7a95f5c712c0");

/// 16 × 16 of the same dark grey.
const std::string kJpeg = bytesOf(
    "ffd8ffdb004300080404040404050505050505060606060606060606060606060707070808080707070606070708"
    "0808080909090808080809090a0a0a0c0c0b0b0e0e0e111114ffc4004b0001010000000000000000000000000000"
    "00070101000000000000000000000000000000001001000000000000000000000000000000001101000000000000"
    "00000000000000000000ffc00011080010001003011200021200031200ffda000c03010002110311003f009e0000"
    "00ffd9");

std::string codes(unsigned primaries, unsigned transfer, unsigned matrix, bool isFullRange) {
  return box("colr",
             "nclx" + big(primaries, 2) + big(transfer, 2) + big(matrix, 2) + (isFullRange ? '\x80' : '\0'));
}

std::optional<Picture> decode(std::string_view file, const ThumbnailRequest& request = {}) {
  return decodeHeif(images::MemorySource(std::as_bytes(std::span(file))), request);
}

ThumbnailRequest request(ThumbnailSource source, std::uint32_t maximumPixelSize = 0) {
  return {.maximumPixelSize = maximumPixelSize, .source = source, .imageTallerThan = {}};
}

/// The sample of luma, or of red.
int sampleAt(const Picture& picture, int x, int y) {
  const AVFrame& frame = *picture.frame;
  const int step = frame.format == AV_PIX_FMT_RGB24 ? 3 : 1;
  return frame.data[0][y * frame.linesize[0] + x * step];
}

void expectGrey(const std::optional<Picture>& picture, int width, int height, int grey) {
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, width);
  EXPECT_EQ(picture->frame->height, height);
  EXPECT_NEAR(sampleAt(*picture, 0, 0), grey, 1);
  EXPECT_NEAR(sampleAt(*picture, width - 1, height - 1), grey, 1);
}

HeifBytes single(const std::string& property = test::turn(0),
                 HeifBytes::Where where = HeifBytes::Where::file) {
  HeifBytes file;
  file.item(1, "hvc1", kDark60, where);
  file.properties(1, {kConfiguration, extents(64, 64), property});
  return file;
}

std::string gridContent(unsigned rows, unsigned columns, unsigned width, unsigned height) {
  return big(0, 1) + big(1, 1) + big(rows - 1, 1) + big(columns - 1, 1) + big(width, 4) + big(height, 4);
}

/// A grid whose tiles are dark but for the light one with the number `light`, from 0 on.
HeifBytes grid(unsigned rows, unsigned columns, unsigned width, unsigned height, unsigned light) {
  HeifBytes file;
  file.item(1, "grid", gridContent(rows, columns, width, height), HeifBytes::Where::itemData);
  file.properties(1, {extents(width, height)});
  for (unsigned i = 0; i < rows * columns; ++i) {
    file.item(2 + i, "hvc1", i == light ? kLight180 : kDark60);
    file.properties(2 + i, {kConfiguration, extents(64, 64)});
  }
  return file;
}

/// A dark picture of 128 × 128 with light thumbnails, of 64 × 64 and of 32 × 32.
std::string withThumbnails() {
  HeifBytes file = grid(2, 2, 128, 128, 4);
  file.reference("dimg", 1, {2, 3, 4, 5});
  for (const std::uint32_t id : {10U, 11U}) {
    file.item(id, "hvc1", kLight180);
    file.reference("thmb", id, {1});
  }
  file.properties(10, {kConfiguration, extents(64, 64)});
  file.properties(11, {kConfiguration, extents(32, 32)});
  return file.build();
}

TEST(HeifDecoder, ItemsOfBothCodecsAreDecoded) {
  expectGrey(decode(single().build()), 64, 64, 60);
  HeifBytes file;
  file.item(1, "av01", kAv1Dark60);
  file.properties(1, {kAv1Configuration, extents(64, 64)});
  expectGrey(decode(file.build("avif")), 64, 64, 60);
}

TEST(HeifDecoder, AnItemThatIsAJpegIsDecoded) {
  HeifBytes file;
  file.item(1, "jpeg", kJpeg);
  file.properties(1, {extents(16, 16)});
  expectGrey(decode(file.build("jpeg")), 16, 16, 60);
}

TEST(HeifDecoder, ItemsCanLieInTheItemDataOrInExtents) {
  using Where = HeifBytes::Where;
  for (const Where where : {Where::itemData, Where::twoExtents, Where::apart}) {
    SCOPED_TRACE(static_cast<int>(where));
    expectGrey(decode(single(test::turn(0), where).build()), 64, 64, 60);
  }
}

TEST(HeifDecoder, WhatIsCodedLargerThanItIsIsCropped) {
  HeifBytes file;
  file.item(1, "hvc1", kDark60);
  file.properties(1, {kConfiguration, extents(49, 30)});
  expectGrey(decode(file.build()), 49, 30, 60);
}

TEST(HeifDecoder, APictureIsNeitherTurnedNorMirroredNorCut) {
  HeifBytes file;
  file.item(1, "hvc1", kDark60);
  file.properties(1, {kConfiguration, extents(64, 40), test::turn(1), test::mirror(0),
                      box("clap", big(8, 4) + big(1, 4) + big(8, 4) + big(1, 4) + std::string(16, '\0'))});
  expectGrey(decode(file.build()), 64, 40, 60);
}

TEST(HeifDecoder, TilesComeToLieInRowsAndAreCutOffAtTheBorders) {
  HeifBytes file = grid(2, 3, 161, 99, 4);
  file.reference("dimg", 1, {2, 3, 4, 5, 6, 7});
  const auto picture = decode(file.build());
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->width, 161);
  EXPECT_EQ(picture->frame->height, 99);
  for (const auto& [x, y] : {std::pair(64, 64), std::pair(127, 98)})
    EXPECT_NEAR(sampleAt(*picture, x, y), 180, 1);
  for (const auto& [x, y] :
       {std::pair(0, 0), std::pair(63, 98), std::pair(64, 63), std::pair(128, 64), std::pair(160, 98)})
    EXPECT_NEAR(sampleAt(*picture, x, y), 60, 1) << x << ',' << y;
}

TEST(HeifDecoder, ATileCanServeInManyPlaces) {
  HeifBytes repeated;
  repeated.item(1, "grid", gridContent(2, 2, 128, 128));
  repeated.properties(1, {extents(128, 128)});
  repeated.item(2, "hvc1", kDark60);
  repeated.properties(2, {kConfiguration, extents(64, 64)});
  repeated.reference("dimg", 1, {2, 2, 2, 2});
  expectGrey(decode(repeated.build()), 128, 128, 60);
}

TEST(HeifDecoder, AGridWhoseTilesDoNotCoverItIsNotDecoded) {
  HeifBytes tooFew = grid(2, 2, 128, 128, 0);
  tooFew.reference("dimg", 1, {2, 3, 4});
  EXPECT_FALSE(decode(tooFew.build()));
  HeifBytes tooSmall = grid(2, 2, 129, 128, 0);
  tooSmall.reference("dimg", 1, {2, 3, 4, 5});
  EXPECT_FALSE(decode(tooSmall.build()));
}

TEST(HeifDecoder, TheThumbnailItemServesSmallRequests) {
  const std::string file = withThumbnails();
  expectGrey(decode(file, request(ThumbnailSource::full, 64)), 64, 64, 180);
  expectGrey(decode(file, request(ThumbnailSource::full, 33)), 64, 64, 180);
  expectGrey(decode(file, request(ThumbnailSource::full, 32)), 32, 32, 180);
  expectGrey(decode(file, request(ThumbnailSource::full, 65)), 128, 128, 60);
  expectGrey(decode(file, request(ThumbnailSource::full, 0)), 128, 128, 60);
  expectGrey(decode(file, request(ThumbnailSource::full, 5000)), 128, 128, 60);
}

TEST(HeifDecoder, AnEmbeddedThumbnailIsTheLargestWhenNoneIsLargeEnough) {
  const std::string file = withThumbnails();
  for (const ThumbnailSource source : {ThumbnailSource::embedded, ThumbnailSource::embeddedElseFull}) {
    expectGrey(decode(file, request(source, 0)), 64, 64, 180);
    expectGrey(decode(file, request(source, 100)), 64, 64, 180);
    expectGrey(decode(file, request(source, 20)), 32, 32, 180);
  }
}

TEST(HeifDecoder, OnlyAnEmbeddedThumbnailMeansNothingWhereThereIsNone) {
  EXPECT_FALSE(decode(single().build(), request(ThumbnailSource::embedded)));
  expectGrey(decode(single().build(), request(ThumbnailSource::embeddedElseFull)), 64, 64, 60);
}

TEST(HeifDecoder, ABrokenThumbnailMakesWayForTheImage) {
  HeifBytes file = single();
  file.item(2, "hvc1", "no picture");
  file.properties(2, {kConfiguration, extents(48, 48)});
  file.reference("thmb", 2, {1});
  EXPECT_FALSE(decode(file.build(), request(ThumbnailSource::embedded)));
  expectGrey(decode(file.build(), request(ThumbnailSource::embeddedElseFull)), 64, 64, 60);
  expectGrey(decode(file.build(), request(ThumbnailSource::full, 32)), 64, 64, 60);
}

TEST(HeifDecoder, ColoursAreWhatTheFileSaysBeforeWhatTheCodedBytesSay) {
  const auto silent = decode(single().build());
  ASSERT_TRUE(silent);
  EXPECT_EQ(silent->frame->colorspace, AVCOL_SPC_SMPTE170M);
  EXPECT_EQ(silent->frame->color_range, AVCOL_RANGE_JPEG);
  const auto outspoken = decode(single(codes(9, 16, 9, false)).build());
  ASSERT_TRUE(outspoken);
  EXPECT_EQ(outspoken->frame->colorspace, AVCOL_SPC_BT2020_NCL);
  EXPECT_EQ(outspoken->frame->color_range, AVCOL_RANGE_MPEG);
  EXPECT_EQ(outspoken->frame->color_primaries, AVCOL_PRI_BT2020);
  EXPECT_EQ(outspoken->frame->color_trc, AVCOL_TRC_SMPTE2084);
}

TEST(HeifDecoder, CodesThatNobodyKnowsCountAsNotSaid) {
  const auto picture = decode(single(codes(0xFFFF, 0xFFFF, 0xFFFF, true)).build());
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->colorspace, AVCOL_SPC_SMPTE170M);
  EXPECT_EQ(picture->frame->color_primaries, AVCOL_PRI_UNSPECIFIED);
  EXPECT_EQ(picture->frame->color_trc, AVCOL_TRC_UNSPECIFIED);
}

TEST(HeifDecoder, TheProfileComesAlongUnlessItIsHuge) {
  const auto profileWith = [](const std::string& property) {
    const auto picture = decode(single(property).build());
    return picture ? picture->iccProfile.size() : ~std::size_t{0};
  };
  EXPECT_EQ(profileWith(box("colr", "prof" + std::string(500, 'p'))), 500U);
  EXPECT_EQ(profileWith(box("colr", "rICC" + std::string(500, 'p'))), 500U);
  EXPECT_EQ(profileWith(codes(1, 13, 6, true)), 0U);
  EXPECT_EQ(profileWith(box("colr", "prof" + std::string(4'194'305, 'p'))), 0U);
}

TEST(HeifDecoder, AGridHasTheColoursOfItsTilesUnlessItSaysOthers) {
  HeifBytes file;
  file.item(1, "grid", gridContent(1, 1, 64, 64));
  file.item(2, "hvc1", kDark60);
  file.properties(1, {extents(64, 64)});
  file.properties(2, {kConfiguration, extents(64, 64), codes(1, 13, 1, true), box("colr", "profICC")});
  file.reference("dimg", 1, {2});
  const auto picture = decode(file.build());
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->colorspace, AVCOL_SPC_BT709);
  EXPECT_EQ(picture->iccProfile.size(), 3U);
}

/// A picture that is another one, with nothing but properties of its own.
std::string derived() {
  HeifBytes file;
  file.item(1, "iden");
  file.properties(1, {extents(64, 64)});
  file.item(2, "hvc1", kDark60);
  file.properties(2, {kConfiguration, extents(64, 64)});
  file.reference("dimg", 1, {2});
  return file.build();
}

/// A light picture on a dark ground.
std::string overlay() {
  HeifBytes file;
  const std::string ground = big(60 * 257, 2) + big(60 * 257, 2) + big(60 * 257, 2) + big(0xFFFF, 2);
  file.item(1, "iovl", big(0, 2) + ground + big(100, 2) + big(80, 2) + big(20, 2) + big(10, 2));
  file.properties(1, {extents(100, 80)});
  file.item(2, "hvc1", kLight180);
  file.properties(2, {kConfiguration, extents(64, 64)});
  file.reference("dimg", 1, {2});
  return file.build();
}

TEST(HeifDecoder, DerivedPicturesOfOtherKindsAreDecoded) {
  expectGrey(decode(derived()), 64, 64, 60);
  const auto picture = decode(overlay());
  expectGrey(picture, 100, 80, 60);
  ASSERT_TRUE(picture);
  EXPECT_NEAR(sampleAt(*picture, 20, 10), 180, 1);
  EXPECT_NEAR(sampleAt(*picture, 83, 73), 180, 1);
  EXPECT_NEAR(sampleAt(*picture, 84, 74), 60, 1);
}

/// From here on, this process makes no more threads.
void forbidThreads() {
  std::array<sock_filter, 5> program{{BPF_STMT(BPF_LD | BPF_W | BPF_ABS, offsetof(seccomp_data, nr)),
                                      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_clone, 1, 0),
                                      BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, SYS_clone3, 0, 1),
                                      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ERRNO | EPERM),
                                      BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW)}};
  const sock_fprog filter{program.size(), program.data()};
  const bool isDone = ::prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
                      ::prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter) == 0;
  if (!isDone) ::_exit(2);
}

TEST(HeifDecoderDeathTest, NoThreadIsNeededForAnyKindOfPicture) {
  const auto decodeAll = [] {
    constexpr unsigned kSecondsUntilItHangs = 60;
    ::alarm(kSecondsUntilItHangs);
    forbidThreads();
    for (const std::string& file : {single().build(), withThumbnails(), derived(), overlay()}) {
      if (!decode(file)) ::_exit(1);
    }
    ::_exit(0);
  };
  EXPECT_EXIT(decodeAll(), testing::ExitedWithCode(0), "");
}

TEST(HeifDecoder, WhatIsNoHeifGivesNothing) {
  EXPECT_FALSE(decode(""));
  EXPECT_FALSE(decode("\xFF\xD8\xFF\xE0 not a box"));
  EXPECT_FALSE(decode(test::fileType("mp42", "isomqt  ") + box("moov", "")));
  EXPECT_FALSE(decode(test::fileType("heic") + box("mdat", kDark60)));
}

TEST(HeifDecoder, HugeClaimsAreHarmless) {
  HeifBytes grids;
  grids.item(1, "grid", gridContent(256, 256, 0xFFFFFFFF, 0xFFFFFFFF));
  grids.item(2, "hvc1", kDark60);
  grids.properties(1, {extents(0xFFFFFFFF, 0xFFFFFFFF)});
  grids.properties(2, {kConfiguration, extents(64, 64)});
  grids.reference("dimg", 1, {2});
  EXPECT_FALSE(decode(grids.build()));
  HeifBytes wide;
  wide.item(1, "grid", gridContent(256, 256, 16384, 16384));
  wide.item(2, "hvc1", kDark60);
  wide.properties(2, {kConfiguration, extents(64, 64)});
  wide.reference("dimg", 1, {2});
  EXPECT_FALSE(decode(wide.build())) << "it has not nearly all of its tiles";
  HeifBytes codedSmaller;
  codedSmaller.item(1, "hvc1", kDark60);
  codedSmaller.properties(1, {kConfiguration, extents(0xFFFFFFFF, 0xFFFFFFFF)});
  expectGrey(decode(codedSmaller.build()), 64, 64, 60);
}

TEST(HeifDecoder, AnItemThatClaimsToGoBeyondTheFileGivesNothing) {
  const std::string file = single().build();
  const std::size_t place = file.find(big(kDark60.size(), 4), file.find("iloc"));
  ASSERT_NE(place, std::string::npos);
  for (const std::uint32_t length : {0x17U, 0x10000000U, 0x7FFFFFFFU, 0xFFFFFFFFU})
    EXPECT_FALSE(decode(std::string(file).replace(place, 4, big(length, 4)))) << length;
}

TEST(HeifDecoder, AGridOfItselfEnds) {
  HeifBytes file;
  file.item(1, "grid", gridContent(2, 2, 128, 128));
  file.properties(1, {extents(128, 128)});
  file.reference("dimg", 1, {1, 1, 1, 1});
  EXPECT_FALSE(decode(file.build()));
}

TEST(HeifDecoder, NoCutOfAFileGivesAPicture) {
  HeifBytes file = grid(2, 2, 128, 128, 0);
  file.reference("dimg", 1, {2, 3, 4, 5});
  const std::string bytes = file.build();
  ASSERT_TRUE(decode(bytes));
  for (std::size_t length = 0; length < bytes.size(); ++length)
    EXPECT_FALSE(decode(bytes.substr(0, length))) << length;
}

TEST(HeifDecoder, NoByteThatIsDifferentLeadsBeyondTheLimits) {
  const std::string bytes = withThumbnails();
  for (std::size_t place = 0; place < bytes.size(); ++place) {
    for (const char other : {'\0', '\1', '\x7F', '\xFF'}) {
      std::string changed = bytes;
      changed[place] = other;
      const auto picture = decode(changed, request(ThumbnailSource::full, 64));
      if (!picture) continue;
      EXPECT_LE(picture->frame->width, 128);
      EXPECT_LE(picture->frame->height, 128);
    }
  }
}

std::optional<Picture> decodeSeed(const char* name) {
  std::ifstream file(std::filesystem::path(BRIVOD_SOURCE_DIR) / "fuzz/seeds/decode_heif" / name,
                     std::ios::binary);
  const std::string bytes{std::istreambuf_iterator<char>(file), {}};
  return decodeHeif(images::MemorySource(std::as_bytes(std::span(bytes))), {});
}

TEST(HeifDecoderTest, ColoursThatNoOneKnowsAreNotTaken) {
  // The coded pictures state matrix 38 and primaries 127, which ITU-T H.273 reserves.
  const auto matrix = decodeSeed("unknown_matrix");
  ASSERT_TRUE(matrix);
  EXPECT_EQ(matrix->frame->colorspace, AVCOL_SPC_SMPTE170M);
  const auto primaries = decodeSeed("unknown_primaries");
  ASSERT_TRUE(primaries);
  EXPECT_NE(static_cast<int>(primaries->frame->color_primaries), 127);
}

}  // namespace
}  // namespace brivo::imaging
