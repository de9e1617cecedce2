// SPDX-License-Identifier: MIT
#include "imaging/made_movies.h"

extern "C" {
#include <libavformat/avformat.h>
#include <libswscale/swscale.h>
}

#include <filesystem>
#include <memory>
#include <span>
#include <stdexcept>

#include "imaging/codec.h"
#include "imaging/made_pictures.h"
#include "support/temporary_folder.h"

namespace brivo::test {

namespace {

constexpr AVRational kFrameTime{1, 25};

void check(int result, const char* what) {
  if (result < 0) throw std::runtime_error(std::string("cannot ") + what);
}

struct FreeMuxer {
  void operator()(AVFormatContext* muxer) const {
    avio_closep(&muxer->pb);
    avformat_free_context(muxer);
  }
};
struct FreeEncoder {
  void operator()(AVCodecContext* encoder) const { avcodec_free_context(&encoder); }
};
using Muxer = std::unique_ptr<AVFormatContext, FreeMuxer>;
using Encoder = std::unique_ptr<AVCodecContext, FreeEncoder>;

Encoder openEncoder(const MadeMovie& movie, bool isHeaderGlobal) {
  const AVCodec* codec = avcodec_find_encoder_by_name(movie.encoder);
  if (!codec) throw std::runtime_error(std::string("no encoder ") + movie.encoder);
  Encoder encoder(avcodec_alloc_context3(codec));
  encoder->width = static_cast<int>(movie.width);
  encoder->height = static_cast<int>(movie.height);
  encoder->pix_fmt = movie.format;
  encoder->time_base = kFrameTime;
  encoder->framerate = av_inv_q(kFrameTime);
  encoder->sample_aspect_ratio = movie.pixelShape;
  encoder->thread_count = 1;
  encoder->strict_std_compliance = FF_COMPLIANCE_UNOFFICIAL;
  encoder->global_quality = 2 * FF_QP2LAMBDA;
  encoder->bit_rate = 2'000'000;
  if (isHeaderGlobal) encoder->flags |= AV_CODEC_FLAG_GLOBAL_HEADER;
  check(avcodec_open2(encoder.get(), codec, nullptr), "open the encoder");
  return encoder;
}

struct FreeScaler {
  void operator()(SwsContext* scaler) const { sws_freeContext(scaler); }
};

imaging::Frame inFormat(const AVFrame& from, AVPixelFormat format) {
  imaging::Frame to = imaging::makeFrame(format, static_cast<std::uint32_t>(from.width),
                                         static_cast<std::uint32_t>(from.height));
  const std::unique_ptr<SwsContext, FreeScaler> scaler(
      sws_getContext(from.width, from.height, AV_PIX_FMT_YUVJ420P, to->width, to->height, format, SWS_BICUBIC,
                     nullptr, nullptr, nullptr));
  check(
      scaler ? sws_scale(scaler.get(), from.data, from.linesize, 0, from.height, to->data, to->linesize) : -1,
      "convert a picture");
  return to;
}

imaging::Frame frameOf(const MadeMovie& movie, int number) {
  const imaging::Frame picture = madeFrame(movie.width, movie.height);
  for (int y = 0; y < picture->height; ++y) {
    const auto row = std::span(picture->data[0] + static_cast<std::ptrdiff_t>(picture->linesize[0]) * y,
                               static_cast<std::size_t>(picture->width));
    for (std::uint8_t& sample : row) sample = static_cast<std::uint8_t>(std::min(255, sample + 2 * number));
  }
  imaging::Frame frame = inFormat(*picture, movie.format);
  frame->pts = number;
  frame->quality = 2 * FF_QP2LAMBDA;
  return frame;
}

void writePackets(AVCodecContext& encoder, AVFormatContext& muxer) {
  const imaging::Packet packet(av_packet_alloc());
  while (avcodec_receive_packet(&encoder, packet.get()) == 0) {
    packet->duration = 1;
    av_packet_rescale_ts(packet.get(), kFrameTime, muxer.streams[0]->time_base);
    packet->stream_index = 0;
    check(av_interleaved_write_frame(&muxer, packet.get()), "write a packet");
  }
}

class MuxerOptions {
 public:
  explicit MuxerOptions(const MadeMovie& movie) {
    for (const auto& [key, value] : movie.muxerOptions) av_dict_set(&options_, key.c_str(), value.c_str(), 0);
  }
  ~MuxerOptions() { av_dict_free(&options_); }
  MuxerOptions(const MuxerOptions&) = delete;
  MuxerOptions& operator=(const MuxerOptions&) = delete;
  AVDictionary** get() { return &options_; }

 private:
  AVDictionary* options_ = nullptr;
};

void write(const MadeMovie& movie, const std::string& path) {
  av_log_set_level(AV_LOG_QUIET);
  AVFormatContext* made = nullptr;
  check(avformat_alloc_output_context2(&made, nullptr, movie.container, path.c_str()), "make a muxer");
  const Muxer muxer(made);
  const Encoder encoder = openEncoder(movie, (muxer->oformat->flags & AVFMT_GLOBALHEADER) != 0);
  AVStream* stream = avformat_new_stream(muxer.get(), nullptr);
  stream->time_base = kFrameTime;
  stream->avg_frame_rate = encoder->framerate;
  stream->sample_aspect_ratio = movie.pixelShape;
  check(avcodec_parameters_from_context(stream->codecpar, encoder.get()), "describe the track");
  for (const auto& [key, value] : movie.metadata)
    av_dict_set(&muxer->metadata, key.c_str(), value.c_str(), 0);
  check(avio_open(&muxer->pb, path.c_str(), AVIO_FLAG_WRITE), "make the file");
  MuxerOptions options(movie);
  check(avformat_write_header(muxer.get(), options.get()), "write the header");
  for (int i = 0; i < movie.frames; ++i) {
    check(avcodec_send_frame(encoder.get(), frameOf(movie, i).get()), "encode");
    writePackets(*encoder, *muxer);
  }
  check(avcodec_send_frame(encoder.get(), nullptr), "finish encoding");
  writePackets(*encoder, *muxer);
  check(av_write_trailer(muxer.get()), "finish the file");
}

}  // namespace

std::string madeMovie(const MadeMovie& movie) {
  const TemporaryFolder folder;
  const std::string path = folder / "movie";
  write(movie, path);
  return readFile(path);
}

}  // namespace brivo::test
