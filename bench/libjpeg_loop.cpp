// SPDX-License-Identifier: MIT
#include "libjpeg_loop.h"

#include <algorithm>
#include <memory>
#include <stdexcept>
#include <vector>

#include "jpeg_writer.h"

namespace brivo::bench {

namespace {

constexpr int kQuality = 85;

/// A decoder that takes its bytes from what is attached to its codec.
class Reader {
 public:
  Reader() {
    codec_.err = jpeg_std_error(&errors_);
    jpeg_create_decompress(&codec_);
  }
  ~Reader() { jpeg_destroy_decompress(&codec_); }
  Reader(const Reader&) = delete;
  Reader& operator=(const Reader&) = delete;

  jpeg_decompress_struct& codec() { return codec_; }

 private:
  jpeg_error_mgr errors_{};
  jpeg_decompress_struct codec_{};
};

unsigned longerSideOf(const jpeg_decompress_struct& codec) {
  return std::max(codec.image_width, codec.image_height);
}

void chooseScale(jpeg_decompress_struct& codec, unsigned pixels) {
  codec.scale_denom = 8;
  codec.scale_num = 1;
  while (longerSideOf(codec) * codec.scale_num < pixels * codec.scale_denom) ++codec.scale_num;
}

std::string codedAgain(jpeg_decompress_struct& codec) {
  JpegWriter writer(codec.output_width, codec.output_height, kQuality);
  std::vector<JSAMPLE> row(JpegWriter::kSamplesPerPixel * codec.output_width);
  while (codec.output_scanline < codec.output_height) {
    JSAMPROW samples = row.data();
    jpeg_read_scanlines(&codec, &samples, 1);
    writer.write(row);
  }
  return writer.finish();
}

}  // namespace

void scaleWithLibjpeg(const std::string& path, unsigned pixels) {
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "rbe"), &std::fclose);
  if (!file) throw std::runtime_error("cannot open " + path);
  Reader reader;
  jpeg_decompress_struct& codec = reader.codec();
  jpeg_stdio_src(&codec, file.get());
  jpeg_read_header(&codec, TRUE);
  chooseScale(codec, pixels);
  codec.out_color_space = JCS_YCbCr;
  jpeg_start_decompress(&codec);
  codedAgain(codec);
  jpeg_finish_decompress(&codec);
}

unsigned longerSideOf(std::span<const std::byte> jpeg) {
  Reader reader;
  jpeg_decompress_struct& codec = reader.codec();
  jpeg_mem_src(&codec, reinterpret_cast<const unsigned char*>(jpeg.data()), jpeg.size());
  jpeg_read_header(&codec, TRUE);
  return longerSideOf(codec);
}

}  // namespace brivo::bench
