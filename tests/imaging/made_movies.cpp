// SPDX-License-Identifier: MIT
#include "imaging/made_movies.h"

extern "C" {
#include <libavformat/avformat.h>
#include <libswscale/swscale.h>
}

#include <filesystem>
#include <memory>
#include <optional>
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

/// Where the packets of an encoder go.
struct Track {
  AVFormatContext& muxer;
  AVStream& stream;
};

void writePackets(AVCodecContext& encoder, const Track& track) {
  const imaging::Packet packet(av_packet_alloc());
  while (avcodec_receive_packet(&encoder, packet.get()) == 0) {
    if (packet->duration == 0) packet->duration = 1;
    av_packet_rescale_ts(packet.get(), encoder.time_base, track.stream.time_base);
    packet->stream_index = track.stream.index;
    check(av_interleaved_write_frame(&track.muxer, packet.get()), "write a packet");
  }
}

/// `frame` null: the end.
void encode(AVCodecContext& encoder, const AVFrame* frame, const Track& track) {
  check(avcodec_send_frame(&encoder, frame), "encode");
  writePackets(encoder, track);
}

AVStream& addTrack(AVFormatContext& muxer, const AVCodecContext& encoder) {
  AVStream* stream = avformat_new_stream(&muxer, nullptr);
  stream->time_base = encoder.time_base;
  stream->avg_frame_rate = encoder.framerate;
  stream->sample_aspect_ratio = encoder.sample_aspect_ratio;
  check(avcodec_parameters_from_context(stream->codecpar, &encoder), "describe the track");
  return *stream;
}

/// A track of silence.
class Sound {
 public:
  explicit Sound(AVFormatContext& muxer)
      : encoder_(openEncoder(muxer.oformat->audio_codec)),
        track_{muxer, addTrack(muxer, *encoder_)},
        silence_(av_frame_alloc()) {
    silence_->format = encoder_->sample_fmt;
    silence_->sample_rate = encoder_->sample_rate;
    silence_->nb_samples = encoder_->frame_size;
    check(av_channel_layout_copy(&silence_->ch_layout, &encoder_->ch_layout), "lay out silence");
    check(av_frame_get_buffer(silence_.get(), 0), "make silence");
    std::fill_n(silence_->data[0], silence_->linesize[0], std::uint8_t{0});
  }
  /// As far as the pictures before `number`.
  void writeUpTo(int number) {
    for (silence_->pts = written_; av_compare_ts(written_, encoder_->time_base, number, kFrameTime) < 0;
         silence_->pts = written_ += encoder_->frame_size)
      encode(*encoder_, silence_.get(), track_);
  }
  void finish() { encode(*encoder_, nullptr, track_); }

 private:
  static Encoder openEncoder(AVCodecID id) {
    const AVCodec* codec = avcodec_find_encoder(id);
    if (!codec) throw std::runtime_error("no encoder of sound");
    Encoder encoder(avcodec_alloc_context3(codec));
    encoder->sample_fmt = *codec->sample_fmts;
    encoder->sample_rate = 44'100;
    encoder->time_base = {1, encoder->sample_rate};
    av_channel_layout_default(&encoder->ch_layout, 1);
    encoder->bit_rate = 64'000;
    check(avcodec_open2(encoder.get(), codec, nullptr), "open the encoder of sound");
    return encoder;
  }

  const Encoder encoder_;
  const Track track_;
  const imaging::Frame silence_;
  std::int64_t written_ = 0;
};

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
  const Track track{*muxer, addTrack(*muxer, *encoder)};
  std::optional<Sound> sound;
  if (movie.hasSound) sound.emplace(*muxer);
  for (const auto& [key, value] : movie.metadata)
    av_dict_set(&muxer->metadata, key.c_str(), value.c_str(), 0);
  check(avio_open(&muxer->pb, path.c_str(), AVIO_FLAG_WRITE), "make the file");
  MuxerOptions options(movie);
  check(avformat_write_header(muxer.get(), options.get()), "write the header");
  for (int i = 0; i < movie.frames; ++i) {
    if (sound) sound->writeUpTo(i);
    encode(*encoder, frameOf(movie, i).get(), track);
  }
  encode(*encoder, nullptr, track);
  if (sound) sound->finish();
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
