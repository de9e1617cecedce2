// SPDX-License-Identifier: MIT
// Movies that are really coded and muxed, for tests.
#pragma once

extern "C" {
#include <libavcodec/avcodec.h>
}

#include <cstdint>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

namespace brivo::test {

struct MadeMovie {
  const char* container = "mov";  ///< a muxer of libavformat
  const char* encoder = "mjpeg";  ///< of libavcodec
  AVPixelFormat format = AV_PIX_FMT_YUV420P;
  std::uint32_t width = 64;
  std::uint32_t height = 48;
  int frames = 10;  ///< 25 of them a second
  AVRational pixelShape = {1, 1};
  bool hasSound = false;  ///< silence, in a second track
  std::vector<std::pair<std::string, std::string>> muxerOptions = {};
  std::vector<std::pair<std::string, std::string>> metadata = {};
};

/// How tests call it.
inline void PrintTo(const MadeMovie& movie, std::ostream* out) {
  *out << movie.encoder << " in " << movie.container;
}

/// Its pictures are madeFrame(), each a little brighter than the one before. Throws when the library cannot
/// make it.
std::string madeMovie(const MadeMovie& movie);

}  // namespace brivo::test
