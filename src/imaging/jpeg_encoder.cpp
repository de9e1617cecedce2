// SPDX-License-Identifier: MIT
#include "imaging/jpeg_encoder.h"

#include <algorithm>
#include <array>
#include <span>

#include "imaging/jpeg_errors.h"

namespace brivo::imaging {

namespace {

constexpr int kQuality = 85;
constexpr int kMostPlanes = 3;
constexpr int kRowsPerPlane = 2 * DCTSIZE;  // luma, where chroma has half the height

/// Rows of one plane that are coded together: copies with room for whole blocks, the edges repeated into it.
class Strip {
 public:
  Strip(const AVFrame& frame, int plane, int height, int rows)
      : source_(frame.data[plane]), stride_(frame.linesize[plane]), height_(height), rows_(rows) {}

  void allocate(int width) {
    width_ = static_cast<std::size_t>(width);
    const std::size_t padded = (width_ + kRowsPerPlane - 1) / kRowsPerPlane * kRowsPerPlane;
    bytes_.resize(padded * static_cast<std::size_t>(rows_));
    for (int row = 0; row < rows_; ++row)
      pointers_[static_cast<std::size_t>(row)] = &bytes_[padded * static_cast<std::size_t>(row)];
  }

  JSAMPARRAY fill(int firstRow) {
    const std::size_t padded = bytes_.size() / static_cast<std::size_t>(rows_);
    for (int row = 0; row < rows_; ++row) {
      const int from = std::min(firstRow + row, height_ - 1);
      const std::span<const std::uint8_t> pixels(source_ + static_cast<std::ptrdiff_t>(stride_) * from,
                                                 width_);
      std::uint8_t* copy = pointers_[static_cast<std::size_t>(row)];
      std::fill_n(std::ranges::copy(pixels, copy).out, padded - width_, pixels.back());
    }
    return pointers_.data();
  }

  int rows() const { return rows_; }

 private:
  const std::uint8_t* source_;
  int stride_;
  int height_;
  int rows_;
  std::size_t width_ = 0;
  std::vector<std::uint8_t> bytes_;
  std::array<JSAMPROW, kRowsPerPlane> pointers_{};
};

/// Where the library puts what it has coded.
class Destination {
 public:
  void attach(jpeg_compress_struct& codec) {
    manager_.init_destination = [](j_compress_ptr) {};
    manager_.empty_output_buffer = [](j_compress_ptr to) -> boolean { return self(to).append(kPiece); };
    manager_.term_destination = [](j_compress_ptr to) {
      self(to).append(kPiece - self(to).manager_.free_in_buffer);
    };
    codec.dest = &manager_;
    startPiece();
  }
  std::vector<std::byte> take() { return std::move(bytes_); }

 private:
  static constexpr std::size_t kPiece = 16'384;

  static Destination& self(j_compress_ptr codec) { return *reinterpret_cast<Destination*>(codec->dest); }

  boolean append(std::size_t count) {
    const auto coded = std::as_bytes(std::span(piece_).first(count));
    bytes_.insert(bytes_.end(), coded.begin(), coded.end());
    startPiece();
    return TRUE;
  }

  void startPiece() {
    manager_.next_output_byte = piece_.data();
    manager_.free_in_buffer = piece_.size();
  }

  jpeg_destination_mgr manager_{};  // first: the library knows this part alone
  std::array<JOCTET, kPiece> piece_{};
  std::vector<std::byte> bytes_;
};

class Encoder {
 public:
  explicit Encoder(const Picture& picture) : picture_(picture) {
    codec_.err = prepare(errors_);
    const AVFrame& frame = *picture.frame;
    const bool grey = frame.format == AV_PIX_FMT_GRAY8;
    addStrip(frame, 0, frame.width, frame.height, grey ? DCTSIZE : 2 * DCTSIZE);
    for (int plane = 1; plane < kMostPlanes && !grey; ++plane) {
      addStrip(frame, plane, (frame.width + 1) / 2, (frame.height + 1) / 2, DCTSIZE);
    }
  }
  ~Encoder() { jpeg_destroy_compress(&codec_); }
  Encoder(const Encoder&) = delete;
  Encoder& operator=(const Encoder&) = delete;

  std::vector<std::byte> encode() { return run() ? destination_.take() : std::vector<std::byte>(); }

 private:
  void addStrip(const AVFrame& frame, int plane, int width, int height, int rows) {
    strips_.emplace_back(frame, plane, height, rows).allocate(width);
  }

  bool run() {
    if (setjmp(errors_.escape) != 0) return false;
    jpeg_create_compress(&codec_);
    destination_.attach(codec_);
    describe();
    jpeg_start_compress(&codec_, TRUE);
    writeProfile();
    writePlanes();
    jpeg_finish_compress(&codec_);
    return true;
  }

  void describe() {
    codec_.image_width = static_cast<JDIMENSION>(picture_.frame->width);
    codec_.image_height = static_cast<JDIMENSION>(picture_.frame->height);
    codec_.input_components = static_cast<int>(strips_.size());
    codec_.in_color_space = strips_.size() == 1 ? JCS_GRAYSCALE : JCS_YCbCr;
    jpeg_set_defaults(&codec_);  // chroma at half width and height among them
    jpeg_set_quality(&codec_, kQuality, TRUE);
    codec_.raw_data_in = TRUE;
  }

  void writeProfile() {
    if (picture_.iccProfile.empty()) return;
    const auto* bytes = reinterpret_cast<const JOCTET*>(picture_.iccProfile.data());
    jpeg_write_icc_profile(&codec_, bytes, static_cast<unsigned>(picture_.iccProfile.size()));
  }

  void writePlanes() {
    const int rows = strips_.front().rows();
    while (codec_.next_scanline < codec_.image_height) {
      const int strip = static_cast<int>(codec_.next_scanline) / rows;
      std::array<JSAMPARRAY, kMostPlanes> planes{};
      for (std::size_t i = 0; i < strips_.size(); ++i) planes[i] = strips_[i].fill(strip * strips_[i].rows());
      jpeg_write_raw_data(&codec_, planes.data(), static_cast<JDIMENSION>(rows));
    }
  }

  const Picture& picture_;
  std::vector<Strip> strips_;
  JpegErrors errors_{};
  jpeg_compress_struct codec_{};
  Destination destination_;
};

}  // namespace

std::vector<std::byte> encodeJpeg(const Picture& picture) { return Encoder(picture).encode(); }

}  // namespace brivo::imaging
