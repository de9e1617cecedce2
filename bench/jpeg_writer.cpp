// SPDX-License-Identifier: MIT
#include "jpeg_writer.h"

#include <cstdlib>

namespace brivo::bench {

JpegWriter::JpegWriter(unsigned width, unsigned height, int quality) {
  codec_.err = jpeg_std_error(&errors_);
  jpeg_create_compress(&codec_);
  jpeg_mem_dest(&codec_, &bytes_, &size_);
  codec_.image_width = width;
  codec_.image_height = height;
  codec_.input_components = kSamplesPerPixel;
  codec_.in_color_space = JCS_YCbCr;
  jpeg_set_defaults(&codec_);
  jpeg_set_quality(&codec_, quality, TRUE);
  jpeg_start_compress(&codec_, TRUE);
}

JpegWriter::~JpegWriter() {
  jpeg_destroy_compress(&codec_);
  std::free(bytes_);
}

void JpegWriter::write(std::span<JSAMPLE> row) {
  JSAMPROW samples = row.data();
  jpeg_write_scanlines(&codec_, &samples, 1);
}

std::string JpegWriter::finish() {
  jpeg_finish_compress(&codec_);
  return {reinterpret_cast<const char*>(bytes_), size_};
}

}  // namespace brivo::bench
