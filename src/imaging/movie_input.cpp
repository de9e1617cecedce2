// SPDX-License-Identifier: MIT
#include "imaging/movie_input.h"

extern "C" {
#include <libavutil/log.h>
#include <libavutil/mem.h>
}

#include <algorithm>
#include <limits>
#include <span>
#include <utility>

namespace brivo::imaging {

namespace {

constexpr std::size_t kMostAllocatedAtOnce = std::size_t{256} << 20;  // a table of 11 million samples
constexpr std::uint64_t kMostOfIndex = std::uint64_t{512} << 20;
constexpr std::uint64_t kMostOfStreams = 2'097'152;
constexpr std::uint64_t kMostOfPackets = std::uint64_t{64} << 20;
constexpr std::uint64_t kReadBytes = 32'768;
/// At a place that was jumped to, which may be the index of one fragment of thousands.
constexpr std::uint64_t kReadBytesThere = 4096;
constexpr int kMostStreams = 256;
/// Bytes that are looked at to tell what is in the tracks, unless that is known earlier.
constexpr std::int64_t kProbeBytes = 1'048'576;

/// What lies on cameras' cards and in movie files at all; no lists of other files, no devices, no texts.
constexpr const char* kFormats =
    "mov,mp4,m4a,3gp,3g2,mj2,avi,mpegts,mpeg,mpegvideo,matroska,webm,mxf,asf,flv,dv,ogg,h264,hevc,m4v,mjpeg,"
    "nsv,rm,flic,smk,bink,vivo";

AVInputFormat* const kAnyFormat = nullptr;

}  // namespace

MovieInput::MovieInput(const images::ByteSource& source) : limit_(kMostAllocatedAtOnce), bytes_{source} {}

std::unique_ptr<MovieInput> MovieInput::open(const images::ByteSource& source) {
  std::unique_ptr<MovieInput> input(new MovieInput(source));
  return input->openContext() ? std::move(input) : nullptr;
}

MovieInput::~MovieInput() {
  avformat_close_input(&context_);
  if (reader_) av_freep(&reader_->buffer);
  avio_context_free(&reader_);
}

bool MovieInput::openContext() {
  av_log_set_level(AV_LOG_QUIET);  // what it says of bad files is for people who debug it
  auto* buffer = static_cast<unsigned char*>(av_malloc(kReadBytes));
  if (!buffer) return false;
  reader_ = avio_alloc_context(buffer, kReadBytes, 0, &bytes_, &readBytes, nullptr, &seekTo);
  context_ = avformat_alloc_context();
  if (!reader_ || !context_) {
    if (!reader_) av_free(buffer);
    return false;
  }
  context_->pb = reader_;
  context_->format_whitelist = av_strdup(kFormats);
  context_->max_streams = kMostStreams;
  context_->probesize = kProbeBytes;
  context_->io_open = [](AVFormatContext*, AVIOContext**, const char*, int, AVDictionary**) {
    return AVERROR(EPERM);
  };
  bytes_.left = kMostOfIndex;
  // Frees the context when it fails.
  return avformat_open_input(&context_, "", kAnyFormat, nullptr) == 0;
}

int MovieInput::readBytes(void* opaque, std::uint8_t* buffer, int size) {
  auto& bytes = *static_cast<Bytes*>(opaque);
  std::uint64_t wanted = std::min(static_cast<std::uint64_t>(std::max(size, 0)), bytes.left);
  // More than a buffer is only asked for when it is needed.
  if (std::exchange(bytes.isElsewhere, false) && wanted <= kReadBytes)
    wanted = std::min(wanted, kReadBytesThere);
  const auto room = std::as_writable_bytes(std::span(buffer, static_cast<std::size_t>(wanted)));
  const std::size_t count = room.empty() ? 0 : bytes.source.read(room, bytes.position);
  bytes.position += count;
  bytes.left -= count;
  return count == 0 ? AVERROR_EOF : static_cast<int>(count);
}

std::int64_t MovieInput::seekTo(void* opaque, std::int64_t offset, int whence) {
  auto& bytes = *static_cast<Bytes*>(opaque);
  const auto size = static_cast<std::int64_t>(bytes.source.size());
  if (whence == AVSEEK_SIZE) return size;
  const std::int64_t base = (whence & ~AVSEEK_FORCE) == SEEK_CUR   ? static_cast<std::int64_t>(bytes.position)
                            : (whence & ~AVSEEK_FORCE) == SEEK_END ? size
                                                                   : 0;
  const bool isBeyond = offset > std::numeric_limits<std::int64_t>::max() - base;
  if (isBeyond || base + offset < 0) return AVERROR(EINVAL);
  const std::int64_t target = base + offset;
  bytes.isElsewhere = bytes.isElsewhere || static_cast<std::uint64_t>(target) != bytes.position;
  bytes.position = static_cast<std::uint64_t>(target);
  return target;
}

void MovieInput::completeStreams() {
  if (std::exchange(isComplete_, true)) return;  // the library cannot do it twice
  bytes_.left = kMostOfStreams;
  (void)avformat_find_stream_info(context_, nullptr);  // what it has found before it failed counts
}

void MovieInput::readOnly(const AVStream& stream) {
  wanted_ = stream.index;
  for (AVStream* other : std::span(context_->streams, context_->nb_streams))
    other->discard = other == &stream ? AVDISCARD_DEFAULT : AVDISCARD_ALL;
  bytes_.left = kMostOfPackets;
  packetBytesLeft_ = kMostOfPackets;
}

bool MovieInput::charge(const AVPacket& packet) {
  constexpr std::uint64_t kPacketItself = 512;
  const std::uint64_t cost = kPacketItself + static_cast<std::uint64_t>(packet.size);
  if (cost > packetBytesLeft_) return false;
  packetBytesLeft_ -= cost;
  return true;
}

Packet MovieInput::next() {
  Packet packet(av_packet_alloc());
  while (packet && av_read_frame(context_, packet.get()) == 0) {
    if (!charge(*packet)) return nullptr;
    // Covers, and what was read to find out about the streams, come whatever is discarded.
    if (packet->stream_index == wanted_) return packet;
    av_packet_unref(packet.get());
  }
  return nullptr;
}

bool isVideo(const AVStream& stream) {
  return stream.codecpar->codec_type == AVMEDIA_TYPE_VIDEO &&
         (stream.disposition & (AV_DISPOSITION_ATTACHED_PIC | AV_DISPOSITION_TIMED_THUMBNAILS)) == 0;
}

}  // namespace brivo::imaging
