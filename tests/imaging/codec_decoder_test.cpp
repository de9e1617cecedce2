// SPDX-License-Identifier: MIT
#include <gtest/gtest.h>

extern "C" {
#include <libavcodec/avcodec.h>
}

#include <cstring>
#include <span>

#include "imaging/decode_request.h"
#include "imaging/made_pictures.h"
#include "imaging/scaling.h"
#include "support/image_bytes.h"

namespace brivo::imaging {
namespace {

using test::integer;

std::optional<Picture> decode(std::string_view file, const ThumbnailRequest& request = {}) {
  return decodeWithCodec(images::MemorySource(std::as_bytes(std::span(file))), request);
}

/// A file of one picture, written by libavcodec; empty when it has no such encoder.
std::string encoded(AVCodecID id, Frame frame) {
  const AVCodec* codec = avcodec_find_encoder(id);
  AVCodecContext* context = avcodec_alloc_context3(codec);
  context->width = frame->width;
  context->height = frame->height;
  context->pix_fmt = static_cast<AVPixelFormat>(frame->format);
  context->time_base = {1, 1};
  AVPacket* packet = av_packet_alloc();
  std::string file;
  if (avcodec_open2(context, codec, nullptr) == 0 && avcodec_send_frame(context, frame.get()) == 0 &&
      (avcodec_send_frame(context, nullptr), avcodec_receive_packet(context, packet)) == 0) {
    file.assign(reinterpret_cast<const char*>(packet->data), static_cast<std::size_t>(packet->size));
  }
  av_packet_free(&packet);
  avcodec_free_context(&context);
  return file;
}

Frame filled(AVPixelFormat format, std::uint32_t width, std::uint32_t height, int value) {
  Frame frame = makeFrame(format, width, height);
  for (int y = 0; y < frame->height; ++y) {
    std::memset(frame->data[0] + static_cast<std::ptrdiff_t>(frame->linesize[0]) * y, value,
                static_cast<std::size_t>(frame->linesize[0]));
  }
  return frame;
}

TEST(CodecDecoderTest, EveryContainerIsDecoded) {
  struct Case {
    AVCodecID id;
    AVPixelFormat format;
  };
  for (const auto& [id, format] :
       {Case{AV_CODEC_ID_PNG, AV_PIX_FMT_RGB24}, Case{AV_CODEC_ID_PNG, AV_PIX_FMT_GRAY8},
        Case{AV_CODEC_ID_PNG, AV_PIX_FMT_MONOBLACK}, Case{AV_CODEC_ID_PNG, AV_PIX_FMT_RGBA},
        Case{AV_CODEC_ID_PNG, AV_PIX_FMT_RGB48BE}, Case{AV_CODEC_ID_TIFF, AV_PIX_FMT_RGB24},
        Case{AV_CODEC_ID_TIFF, AV_PIX_FMT_GRAY16LE}, Case{AV_CODEC_ID_BMP, AV_PIX_FMT_BGR24},
        Case{AV_CODEC_ID_JPEG2000, AV_PIX_FMT_RGB24}}) {
    const std::string file = encoded(id, filled(format, 48, 32, 0xFF));
    ASSERT_FALSE(file.empty()) << id;
    auto picture = decode(file, {24});
    ASSERT_TRUE(picture) << id << " " << format;
    EXPECT_EQ(picture->frame->width, 48);
    EXPECT_EQ(picture->frame->height, 32);
    const Frame frame = scaledForJpeg(std::move(picture->frame), {24, 16});
    ASSERT_TRUE(frame);
    EXPECT_NEAR(frame->data[0][0], 255, 2) << id << " " << format;
  }
}

TEST(CodecDecoderTest, PaletteImagesAreDecoded) {
  // GIF89a of 1 x 1 with a palette of black and red; the pixel is red (LZW codes 4, 1, 5 of 3 bits).
  const std::string gif("GIF89a\1\0\1\0\x80\0\0\0\0\0\xFF\0\0\x2C\0\0\0\0\1\0\1\0\0\2\2\x4C\1\0\x3B", 35);
  const auto picture = decode(gif);
  ASSERT_TRUE(picture);
  const Frame pixels = unpacked(*picture->frame);
  EXPECT_EQ(pixels->data[0][1], 255);
  EXPECT_EQ(pixels->data[0][2], 0);
}

TEST(CodecDecoderTest, OnePixelIsAPicture) {
  const auto picture = decode(encoded(AV_CODEC_ID_PNG, filled(AV_PIX_FMT_RGB24, 1, 1, 9)), {160});
  ASSERT_TRUE(picture);
  EXPECT_EQ(picture->frame->height, 1);
}

/// Two pages of 8-bit grey, 8 x 8 and 16 x 64 pixels.
std::string twoPages() {
  test::TiffBytes tiff;
  for (const auto& [width, height] : {std::pair(8U, 8U), std::pair(16U, 64U)}) {
    const std::size_t page = tiff.beginDirectory();
    if (page > 0) tiff.link(page - 1, page);
    tiff.longs(0x0100, {width});
    tiff.longs(0x0101, {height});
    tiff.shorts(0x0102, {8});
    tiff.shorts(0x0103, {1});
    tiff.shorts(0x0106, {1});
    tiff.placed(0x0111, 0x0117, std::string(std::size_t{width} * height, '\x40'));
    tiff.shorts(0x0115, {1});
    tiff.longs(0x0116, {height});
  }
  return tiff.build();
}

TEST(CodecDecoderTest, TheFirstImageThatIsTallerThanWantedIsChosen) {
  const auto heightFor = [](std::optional<std::uint32_t> tallerThan) {
    return decode(twoPages(), {0, ThumbnailSource::full, tallerThan})->frame->height;
  };
  EXPECT_EQ(heightFor(7), 8);
  EXPECT_EQ(heightFor(8), 64);
  EXPECT_EQ(heightFor(64), 8) << "none is tall enough: the first";
  EXPECT_EQ(heightFor(std::nullopt), 8);
}

TEST(CodecDecoderTest, HeadersThatClaimTooMuchAreRefused) {
  std::string png = encoded(AV_CODEC_ID_PNG, filled(AV_PIX_FMT_RGB24, 16, 16, 1));
  png.replace(16, 8, integer(65'535, 4, std::endian::big) + integer(65'535, 4, std::endian::big));
  EXPECT_FALSE(decode(png, {160}));
}

TEST(CodecDecoderTest, DamagedAndTruncatedFilesEndInAPictureOrNone) {
  for (const AVCodecID id : {AV_CODEC_ID_PNG, AV_CODEC_ID_TIFF, AV_CODEC_ID_BMP}) {
    const AVPixelFormat format = id == AV_CODEC_ID_BMP ? AV_PIX_FMT_BGR24 : AV_PIX_FMT_RGB24;
    const std::string good = encoded(id, filled(format, 12, 9, 0x55));
    for (std::size_t at = 0; at < good.size(); ++at) {
      std::string bad = good;
      bad[at] = static_cast<char>(~bad[at]);
      for (const auto& picture : {decode(bad), decode(good.substr(0, at))}) {
        EXPECT_TRUE(!picture || picture->frame->width > 0);
      }
    }
  }
}

TEST(CodecDecoderTest, OtherBytesAreNoPicture) {
  EXPECT_FALSE(decode(""));
  EXPECT_FALSE(decode("BM"));
  EXPECT_FALSE(decode("some text that is no picture at all"));
}

}  // namespace
}  // namespace brivo::imaging
