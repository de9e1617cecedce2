// SPDX-License-Identifier: MIT
#include "imaging/heif_library_codec.h"

#include <libheif/heif.h>
#include <libheif/heif_plugin.h>

extern "C" {
#include <libavutil/imgutils.h>
#include <libavutil/pixdesc.h>
}

#include <algorithm>
#include <array>
#include <new>
#include <vector>

#include "imaging/codec.h"
#include "platform/base/byte_cursor.h"

namespace brivo::imaging {

namespace {

constexpr heif_error kOk{heif_error_Ok, heif_suberror_Unspecified, "ok"};
constexpr heif_error kFailed{heif_error_Decoder_plugin_error, heif_suberror_Unspecified, "not decoded"};

bool isOk(const heif_error& error) { return error.code == heif_error_Ok; }

/// What libheif has handed over: HEVC with a length of four bytes before each unit.
using Bytes = std::vector<std::byte>;

/// The same with a start code instead of each length (ISO/IEC 23008-2 annex B), which needs no configuration.
Bytes withStartCodes(const Bytes& units) {
  constexpr std::array kStartCode{std::byte{0}, std::byte{0}, std::byte{0}, std::byte{1}};
  Bytes stream;
  ByteCursor cursor(units, std::endian::big);
  while (cursor.remaining() != 0) {
    const auto unit = cursor.take(cursor.u32());
    if (!cursor.ok()) break;
    stream.insert(stream.end(), kStartCode.begin(), kStartCode.end());
    stream.insert(stream.end(), unit.begin(), unit.end());
  }
  return stream;
}

Frame decodeBytes(AVCodecID id, const Bytes& bytes) {
  const Packet packet = packetOf(bytes);
  auto codec = Codec::open(id);
  return packet && codec ? codec->decode(*packet) : nullptr;
}

heif_chroma chromaOf(const AVPixFmtDescriptor& format) {
  if (format.nb_components == 1) return heif_chroma_monochrome;
  if (format.log2_chroma_h != 0) return format.log2_chroma_w != 0 ? heif_chroma_420 : heif_chroma_undefined;
  return format.log2_chroma_w != 0 ? heif_chroma_422 : heif_chroma_444;
}

bool copyPlane(heif_image& image, const AVFrame& frame, std::size_t plane) {
  constexpr std::array kChannels{heif_channel_Y, heif_channel_Cb, heif_channel_Cr};
  const auto format = static_cast<AVPixelFormat>(frame.format);
  const AVPixFmtDescriptor& description = *av_pix_fmt_desc_get(format);
  const int width = plane == 0 ? frame.width : AV_CEIL_RSHIFT(frame.width, description.log2_chroma_w);
  const int height = plane == 0 ? frame.height : AV_CEIL_RSHIFT(frame.height, description.log2_chroma_h);
  if (!isOk(heif_image_add_plane(&image, kChannels[plane], width, height, description.comp[0].depth)))
    return false;
  int stride = 0;
  std::uint8_t* pixels = heif_image_get_plane(&image, kChannels[plane], &stride);
  if (!pixels) return false;
  av_image_copy_plane(pixels, stride, frame.data[plane], frame.linesize[plane],
                      av_image_get_linesize(format, frame.width, static_cast<int>(plane)), height);
  return true;
}

/// What a file says itself goes before this.
void setColours(heif_image& image, const AVFrame& frame) {
  heif_color_profile_nclx* colours = heif_nclx_color_profile_alloc();
  if (!colours) return;
  heif_nclx_color_profile_set_color_primaries(colours, static_cast<std::uint16_t>(frame.color_primaries));
  heif_nclx_color_profile_set_transfer_characteristics(colours, static_cast<std::uint16_t>(frame.color_trc));
  heif_nclx_color_profile_set_matrix_coefficients(colours, static_cast<std::uint16_t>(frame.colorspace));
  colours->full_range_flag = frame.color_range == AVCOL_RANGE_JPEG ? 1 : 0;
  heif_image_set_nclx_color_profile(&image, colours);
  heif_nclx_color_profile_free(colours);
}

bool copyPlanes(heif_image& image, const AVFrame& frame, std::size_t planes) {
  for (std::size_t plane = 0; plane < planes; ++plane) {
    if (!copyPlane(image, frame, plane)) return false;
  }
  setColours(image, frame);
  return true;
}

heif_image* imageOf(const AVFrame& frame) {
  const AVPixFmtDescriptor* format = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(frame.format));
  if (!format || (format->flags & AV_PIX_FMT_FLAG_RGB) != 0) return nullptr;
  const heif_chroma chroma = chromaOf(*format);
  const bool isGrey = chroma == heif_chroma_monochrome;
  heif_image* image = nullptr;
  if (!isOk(heif_image_create(frame.width, frame.height,
                              isGrey ? heif_colorspace_monochrome : heif_colorspace_YCbCr, chroma, &image)))
    return nullptr;
  if (copyPlanes(*image, frame, isGrey ? 1 : 3)) return image;
  heif_image_release(image);
  return nullptr;
}

// No exception leaves a function that libheif calls.

heif_error newDecoder(void** decoder) {
  *decoder = new (std::nothrow) Bytes;
  return *decoder ? kOk : kFailed;
}

void freeDecoder(void* decoder) { delete static_cast<Bytes*>(decoder); }

heif_error pushData(void* decoder, const void* data, std::size_t length) {
  const std::span more(static_cast<const std::byte*>(data), length);
  auto& bytes = *static_cast<Bytes*>(decoder);
  try {
    bytes.insert(bytes.end(), more.begin(), more.end());
  } catch (const std::bad_alloc&) {
    return kFailed;
  }
  return kOk;
}

template <AVCodecID kCodec>
heif_error decodeImage(void* decoder, heif_image** image) {
  const auto& bytes = *static_cast<const Bytes*>(decoder);
  try {
    const Frame frame = decodeBytes(kCodec, kCodec == AV_CODEC_ID_HEVC ? withStartCodes(bytes) : bytes);
    *image = frame ? imageOf(*frame) : nullptr;
  } catch (const std::bad_alloc&) {
    *image = nullptr;
  }
  return *image ? kOk : kFailed;
}

void setStrict(void*, int) {}

const char* name() { return "libavcodec without threads"; }

template <heif_compression_format kFormat>
int priorityFor(heif_compression_format format) {
  constexpr int kBeforeAllOthers = 1000;
  return format == kFormat ? kBeforeAllOthers : 0;
}

template <heif_compression_format kFormat, AVCodecID kCodec>
constexpr heif_decoder_plugin kPlugin{3,
                                      name,
                                      nullptr,
                                      nullptr,
                                      priorityFor<kFormat>,
                                      newDecoder,
                                      freeDecoder,
                                      pushData,
                                      decodeImage<kCodec>,
                                      setStrict,
                                      "libavcodec"};

}  // namespace

void useOurCodecInLibheif() {
  [[maybe_unused]] static const bool isDone =
      isOk(heif_register_decoder_plugin(&kPlugin<heif_compression_HEVC, AV_CODEC_ID_HEVC>)) &&
      isOk(heif_register_decoder_plugin(&kPlugin<heif_compression_AV1, AV_CODEC_ID_AV1>));
}

}  // namespace brivo::imaging
