// SPDX-License-Identifier: MIT
#pragma once

extern "C" {
#include <libavformat/avformat.h>
}

#include <cstdint>
#include <memory>

#include "imaging/allocation_limit.h"
#include "imaging/codec.h"
#include "platform/images/byte_source.h"

namespace brivo::imaging {

/// The container of a movie, read by libavformat out of a source, with limits on what that may fetch. Opens
/// nothing else, whatever the movie refers to. *Thread-bound.*
class MovieInput {
 public:
  /// Reads the index of a movie. Null when `source` is no movie, or a broken one. `source` must outlive this.
  static std::unique_ptr<MovieInput> open(const images::ByteSource& source);
  ~MovieInput();
  MovieInput(const MovieInput&) = delete;
  MovieInput& operator=(const MovieInput&) = delete;

  const AVFormatContext& container() const { return *context_; }
  const images::ByteSource& source() const { return bytes_.source; }

  /// Looks into the tracks for what the container has not said of them: after this the streams are as
  /// complete as they get. Reads 2 MiB at most.
  void completeStreams();

  /// Leaves all packets out but those of `stream`, and lets up to 64 MiB be read, and as much come out of it:
  /// packets may share bytes.
  void readOnly(const AVStream& stream);
  /// The next packet of that stream; null at the end, or when the limit is reached.
  Packet next();

 private:
  /// What libavformat reads from.
  struct Bytes {
    const images::ByteSource& source;
    std::uint64_t position = 0;
    std::uint64_t left = 0;    ///< that may still be read
    bool isElsewhere = false;  ///< nothing has been read since a jump
  };

  explicit MovieInput(const images::ByteSource& source);
  bool openContext();
  /// Takes what a packet costs off what may still be given; false when that is not enough.
  bool charge(const AVPacket& packet);

  static int readBytes(void* opaque, std::uint8_t* buffer, int size);
  static std::int64_t seekTo(void* opaque, std::int64_t offset, int whence);

  const AllocationLimit limit_;
  Bytes bytes_;
  AVIOContext* reader_ = nullptr;
  AVFormatContext* context_ = nullptr;
  bool isComplete_ = false;  ///< as far as it gets
  int wanted_ = -1;          ///< index of the stream whose packets are read
  std::uint64_t packetBytesLeft_ = 0;
};

/// Its pictures are shown one after the other, and it is not a picture that stands for the movie.
bool isVideo(const AVStream& stream);

}  // namespace brivo::imaging
