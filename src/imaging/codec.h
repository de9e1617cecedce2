// SPDX-License-Identifier: MIT
// Single pictures, decoded by libavcodec.
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

/// Decodes pictures that share one configuration, each of them whole in itself. Makes no threads.
/// *Thread-bound.*
class Codec {
 public:
  /// `configuration` is what a container keeps for the decoder, such as the content of the hvcC (ISO/IEC
  /// 14496-15) or av1C property of HEIF. None when there is no such decoder, or it refuses.
  static std::optional<Codec> open(AVCodecID id, std::span<const std::byte> configuration = {},
                                   Care care = Care::exact);

  /// The picture in `packet`, in its own size and depth; null when it is broken or beyond the limits.
  Frame decode(const AVPacket& packet);

 private:
  struct FreeContext {
    void operator()(AVCodecContext* context) const { avcodec_free_context(&context); }
  };
  using Context = std::unique_ptr<AVCodecContext, FreeContext>;

  explicit Codec(Context context) : context_(std::move(context)) {}

  Context context_;
};

/// The ICC profile that came with a picture; empty when none did.
std::vector<std::byte> iccProfileOf(const AVFrame& frame);

}  // namespace brivo::imaging
