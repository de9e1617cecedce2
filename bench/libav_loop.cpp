// SPDX-License-Identifier: MIT
#include "libav_loop.h"

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavformat/avformat.h>
#include <libswscale/swscale.h>
}

#include <memory>
#include <stdexcept>
#include <vector>

#include "jpeg_writer.h"

namespace brivo::bench {

namespace {

constexpr int kQuality = 85;

struct Free {
  void operator()(AVFormatContext* input) const { avformat_close_input(&input); }
  void operator()(AVCodecContext* decoder) const { avcodec_free_context(&decoder); }
  void operator()(AVPacket* packet) const { av_packet_free(&packet); }
  void operator()(AVFrame* frame) const { av_frame_free(&frame); }
  void operator()(SwsContext* scaler) const { sws_freeContext(scaler); }
};
template <class Thing>
using Owned = std::unique_ptr<Thing, Free>;

void check(bool succeeded) {
  if (!succeeded) throw std::runtime_error("libavformat, libavcodec or libswscale has failed");
}

Owned<AVFormatContext> opened(const std::string& path) {
  AVFormatContext* input = nullptr;
  check(avformat_open_input(&input, path.c_str(), nullptr, nullptr) == 0);
  Owned<AVFormatContext> owned(input);
  check(avformat_find_stream_info(input, nullptr) >= 0);
  return owned;
}

Owned<AVCodecContext> decoderOf(const AVStream& stream) {
  const AVCodec* codec = avcodec_find_decoder(stream.codecpar->codec_id);
  Owned<AVCodecContext> decoder(avcodec_alloc_context3(codec));
  check(avcodec_parameters_to_context(decoder.get(), stream.codecpar) >= 0 &&
        avcodec_open2(decoder.get(), codec, nullptr) == 0);
  return decoder;
}

Owned<AVFrame> firstFrameOf(AVFormatContext& input) {
  const int index = av_find_best_stream(&input, AVMEDIA_TYPE_VIDEO, -1, -1, nullptr, 0);
  check(index >= 0);
  const Owned<AVCodecContext> decoder = decoderOf(*input.streams[index]);
  const Owned<AVPacket> packet(av_packet_alloc());
  Owned<AVFrame> frame(av_frame_alloc());
  while (av_read_frame(&input, packet.get()) == 0) {
    const bool isVideo = packet->stream_index == index;
    if (isVideo) check(avcodec_send_packet(decoder.get(), packet.get()) == 0);
    av_packet_unref(packet.get());
    if (isVideo && avcodec_receive_frame(decoder.get(), frame.get()) == 0) return frame;
  }
  check(avcodec_send_packet(decoder.get(), nullptr) == 0 &&
        avcodec_receive_frame(decoder.get(), frame.get()) == 0);
  return frame;
}

Owned<AVFrame> scaled(const AVFrame& source, int width) {
  Owned<AVFrame> frame(av_frame_alloc());
  frame->format = AV_PIX_FMT_YUVJ444P;
  frame->width = width;
  frame->height = source.height * width / source.width;
  check(av_frame_get_buffer(frame.get(), 0) == 0);
  const Owned<SwsContext> scaler(
      sws_getContext(source.width, source.height, static_cast<AVPixelFormat>(source.format), frame->width,
                     frame->height, AV_PIX_FMT_YUVJ444P, SWS_BICUBIC, nullptr, nullptr, nullptr));
  check(scaler && sws_scale(scaler.get(), source.data, source.linesize, 0, source.height, frame->data,
                            frame->linesize) == frame->height);
  return frame;
}

std::string codedAsJpeg(const AVFrame& frame) {
  const auto width = static_cast<unsigned>(frame.width);
  JpegWriter writer(width, static_cast<unsigned>(frame.height), kQuality);
  std::vector<JSAMPLE> row(JpegWriter::kSamplesPerPixel * width);
  for (int y = 0; y < frame.height; ++y) {
    for (std::size_t i = 0; i < row.size(); ++i) {
      const std::size_t plane = i % JpegWriter::kSamplesPerPixel;
      row[i] = frame.data[plane][frame.linesize[plane] * y +
                                 static_cast<std::ptrdiff_t>(i / JpegWriter::kSamplesPerPixel)];
    }
    writer.write(row);
  }
  return writer.finish();
}

}  // namespace

std::string firstFrameWithLibav(const std::string& path, unsigned pixels) {
  av_log_set_level(AV_LOG_QUIET);
  const Owned<AVFormatContext> input = opened(path);
  return codedAsJpeg(*scaled(*firstFrameOf(*input), static_cast<int>(pixels)));
}

}  // namespace brivo::bench
