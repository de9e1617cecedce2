// SPDX-License-Identifier: MIT
#include "imaging/codec.h"

extern "C" {
#include <libavutil/mem.h>
}

#include <algorithm>
#include <cstring>
#include <limits>

namespace brivo::imaging {

namespace {

bool setConfiguration(AVCodecContext& context, std::span<const std::byte> configuration) {
  if (configuration.empty()) return true;
  // The context frees it.
  void* copy = av_mallocz(configuration.size() + AV_INPUT_BUFFER_PADDING_SIZE);
  if (!copy) return false;
  context.extradata = static_cast<std::uint8_t*>(copy);
  context.extradata_size = static_cast<int>(configuration.size());
  std::ranges::copy(configuration, static_cast<std::byte*>(copy));
  return true;
}

/// Full range has pixel formats of its own for historical reasons; the frame says it anyway.
void unifyFormat(AVFrame& frame) {
  const auto makeFullRange = [&](AVPixelFormat format) {
    frame.format = format;
    frame.color_range = AVCOL_RANGE_JPEG;
  };
  if (frame.format == AV_PIX_FMT_YUVJ420P) makeFullRange(AV_PIX_FMT_YUV420P);
  if (frame.format == AV_PIX_FMT_YUVJ422P) makeFullRange(AV_PIX_FMT_YUV422P);
  if (frame.format == AV_PIX_FMT_YUVJ444P) makeFullRange(AV_PIX_FMT_YUV444P);
}

/// Bit streams may state codes that no one knows, and the codecs put them into the enumerations as they are.
template <class Code>
void forgetUnknown(Code& code, Code end, Code unspecified) {
  int value = 0;
  static_assert(sizeof value == sizeof code);
  std::memcpy(&value, &code, sizeof value);
  if (value < 0 || value >= end) code = unspecified;
}

void forgetUnknownColours(AVFrame& frame) {
  forgetUnknown(frame.colorspace, AVCOL_SPC_NB, AVCOL_SPC_UNSPECIFIED);
  forgetUnknown(frame.color_primaries, AVCOL_PRI_NB, AVCOL_PRI_UNSPECIFIED);
  forgetUnknown(frame.color_trc, AVCOL_TRC_NB, AVCOL_TRC_UNSPECIFIED);
}

}  // namespace

Packet makePacket(std::size_t length) {
  if (length > std::numeric_limits<int>::max() - AV_INPUT_BUFFER_PADDING_SIZE) return nullptr;
  Packet packet(av_packet_alloc());
  if (!packet || av_new_packet(packet.get(), static_cast<int>(length)) != 0) return nullptr;
  return packet;
}

Packet packetOf(std::span<const std::byte> bytes) {
  Packet packet = makePacket(bytes.size());
  if (packet) std::ranges::copy(bytes, reinterpret_cast<std::byte*>(packet->data));
  return packet;
}

Codec::Context Codec::makeContext(const AVCodec* codec, Care care) {
  av_log_set_level(AV_LOG_QUIET);  // what it says of bad files is for people who debug it
  Context context(codec ? avcodec_alloc_context3(codec) : nullptr);
  if (!context) return nullptr;
  context->thread_count = 1;
  context->max_pixels = static_cast<std::int64_t>(kMostPixels);
  if (care == Care::reduced) context->skip_loop_filter = AVDISCARD_ALL;
  return context;
}

std::optional<Codec> Codec::open(AVCodecID id, std::span<const std::byte> configuration, Care care) {
  const AVCodec* codec = id == AV_CODEC_ID_NONE ? nullptr : avcodec_find_decoder(id);
  Context context = makeContext(codec, care);
  if (!context || !setConfiguration(*context, configuration)) return std::nullopt;
  // The TIFF decoder takes harmless oddities for damage.
  context->err_recognition = AV_EF_CRCCHECK | (id == AV_CODEC_ID_TIFF ? 0 : AV_EF_EXPLODE);
  if (avcodec_open2(context.get(), codec, nullptr) != 0) return std::nullopt;
  return Codec(std::move(context), false);
}

std::optional<Codec> Codec::open(const AVCodecParameters& track, Care care, int halvings) {
  const AVCodec* codec = avcodec_find_decoder(track.codec_id);
  Context context = makeContext(codec, care);
  if (!context || avcodec_parameters_to_context(context.get(), &track) < 0) return std::nullopt;
  context->lowres = std::min<int>(halvings, codec->max_lowres);
  if (avcodec_open2(context.get(), codec, nullptr) != 0) return std::nullopt;
  return Codec(std::move(context), true);
}

bool Codec::isUsable(const AVFrame& frame) const {
  const bool isDamaged = (frame.flags & AV_FRAME_FLAG_CORRUPT) != 0 || frame.decode_error_flags != 0;
  if ((isDamaged && !concealsDamage_) || frame.width <= 0 || frame.height <= 0) return false;
  return isWithinLimits(static_cast<std::uint64_t>(frame.width), static_cast<std::uint64_t>(frame.height));
}

Frame Codec::decode(const AVPacket& packet) {
  Frame frame(av_frame_alloc());
  if (!frame) return nullptr;
  // The end of the stream behind each picture makes the codec hand it out.
  const bool isDecoded = send(&packet) && send(nullptr) && receive(*frame);
  return finish(std::move(frame), isDecoded);
}

Frame Codec::decodeFirst(std::span<const Packet> packets) {
  Frame frame(av_frame_alloc());
  if (!frame) return nullptr;
  const bool isEarly = std::any_of(packets.begin(), packets.end(), [&](const Packet& packet) {
    return send(packet.get()) && receive(*frame);
  });
  const bool isDecoded = isEarly || (send(nullptr) && receive(*frame));
  return finish(std::move(frame), isDecoded);
}

Frame Codec::finish(Frame frame, bool isDecoded) {
  avcodec_flush_buffers(context_.get());
  if (!isDecoded || !isUsable(*frame)) return nullptr;
  unifyFormat(*frame);
  forgetUnknownColours(*frame);
  return frame;
}

std::vector<std::byte> iccProfileOf(const AVFrame& frame) {
  const AVFrameSideData* profile = av_frame_get_side_data(&frame, AV_FRAME_DATA_ICC_PROFILE);
  if (!profile) return {};
  const auto bytes = std::as_bytes(std::span(profile->data, profile->size));
  return {bytes.begin(), bytes.end()};
}

}  // namespace brivo::imaging
