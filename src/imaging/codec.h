// SPDX-License-Identifier: MIT
// Pictures, decoded by libavcodec.
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
}

#include <cstddef>
#include <memory>
#include <optional>
#include <span>
#include <vector>

#include "imaging/picture.h"

namespace brivo::imaging {

struct FreePacket {
  void operator()(AVPacket* packet) const { av_packet_free(&packet); }
};
/// Coded bytes, with the room behind them that codecs want.
using Packet = std::unique_ptr<AVPacket, FreePacket>;
/// A packet of `length` bytes that are to be filled in; null when memory runs out.
Packet makePacket(std::size_t length);
/// A packet with a copy of `bytes`; null as above.
Packet packetOf(std::span<const std::byte> bytes);

/// How much of the decoding is worth its time.
enum class Care {
  exact,    ///< as the standard of the codec has it
  reduced,  ///< without smoothing the borders of blocks: not seen in a picture that is scaled down to a third
};

/// Decodes pictures that share one configuration. Makes no threads.
/// *Thread-bound.*
class Codec {
 public:
  /// `configuration` is what a container keeps for the decoder, such as the content of the hvcC (ISO/IEC
  /// 14496-15) or av1C property of HEIF. None when there is no such decoder, or it refuses.
  static std::optional<Codec> open(AVCodecID id, std::span<const std::byte> configuration = {},
                                   Care care = Care::exact);

  /// Likewise, for the pictures of a movie, in which damage is concealed. They come in halves of their size,
  /// `halvings` times over, as far as the codec can do that by itself.
  static std::optional<Codec> open(const AVCodecParameters& track, Care care, int halvings);

  /// The picture in `packet`, which needs no other, in its own depth, and in its own size but for halvings;
  /// null when it is broken or beyond the limits.
  Frame decode(const AVPacket& packet);
  /// The first picture that is shown of a movie whose packets begin with these, the first of them one that
  /// needs no other; null when they hold none, as above.
  Frame decodeFirst(std::span<const Packet> packets);

 private:
  struct FreeContext {
    void operator()(AVCodecContext* context) const { avcodec_free_context(&context); }
  };
  using Context = std::unique_ptr<AVCodecContext, FreeContext>;

  Codec(Context context, bool concealsDamage)
      : context_(std::move(context)), concealsDamage_(concealsDamage) {}

  static Context makeContext(const AVCodec* codec, Care care);
  bool send(const AVPacket* packet) { return avcodec_send_packet(context_.get(), packet) == 0; }
  bool receive(AVFrame& frame) { return avcodec_receive_frame(context_.get(), &frame) == 0; }
  bool isUsable(const AVFrame& frame) const;
  /// Makes ready for a picture that has nothing to do with those before.
  Frame finish(Frame frame, bool isDecoded);

  Context context_;
  bool concealsDamage_;
};

/// The ICC profile that came with a picture; empty when none did.
std::vector<std::byte> iccProfileOf(const AVFrame& frame);

}  // namespace brivo::imaging
