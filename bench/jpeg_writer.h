// SPDX-License-Identifier: MIT
#pragma once

#include <cstdio>  // jpeglib.h needs it

#include <jpeglib.h>

#include <span>
#include <string>

namespace brivo::bench {

/// Codes rows of YCbCr with libjpeg-turbo, which ends the program when it fails. *Thread-bound.*
class JpegWriter {
 public:
  static constexpr std::size_t kSamplesPerPixel = 3;

  /// `quality` is the library's, from 0 to 100.
  JpegWriter(unsigned width, unsigned height, int quality);
  ~JpegWriter();
  JpegWriter(const JpegWriter&) = delete;
  JpegWriter& operator=(const JpegWriter&) = delete;

  /// The next row; it is left as it is.
  void write(std::span<JSAMPLE> row);
  /// The file, after the last row; once.
  std::string finish();

 private:
  jpeg_error_mgr errors_{};
  jpeg_compress_struct codec_{};
  unsigned char* bytes_ = nullptr;  // of malloc
  unsigned long size_ = 0;
};

}  // namespace brivo::bench
