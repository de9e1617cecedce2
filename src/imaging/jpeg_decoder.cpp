// SPDX-License-Identifier: MIT
#include <algorithm>
#include <array>
#include <cstdlib>
#include <span>

#include "imaging/decode_request.h"
#include "imaging/jpeg_errors.h"
#include "imaging/slice_source.h"
#include "platform/images/image_reader.h"

// Behind jpeglib.h, which it needs.
#include <jerror.h>

namespace brivo::imaging {

namespace {

constexpr std::size_t kPlanes = 3;
constexpr unsigned kLongestProfile = 4 << 20;
/// Each scan of a progressive picture goes over all of it; real ones have about ten.
constexpr int kMostScans = 200;
/// Bytes: the coefficients of a progressive picture of 600 megapixels.
constexpr long kMostMemory = 2'000'000'000;

/// The file as the library reads it. Where it ends too early the library is told of an end of image, once:
/// its last bits may be coded already.
class Input {
 public:
  explicit Input(const images::ByteSource& source) : source_(source) {}

  void attach(jpeg_decompress_struct& codec) {
    manager_.init_source = [](j_decompress_ptr) {};
    manager_.fill_input_buffer = [](j_decompress_ptr from) { return self(from).fill(); };
    manager_.skip_input_data = [](j_decompress_ptr from, long count) { self(from).skip(count); };
    manager_.resync_to_restart = jpeg_resync_to_restart;
    manager_.term_source = [](j_decompress_ptr) {};
    codec.src = &manager_;
  }
  bool hasEnded() const { return hasEnded_; }

 private:
  static constexpr std::size_t kPiece = 65'536;

  static Input& self(j_decompress_ptr codec) { return *reinterpret_cast<Input*>(codec->src); }

  boolean fill() {
    std::size_t count = source_.read(std::as_writable_bytes(std::span(piece_)), next_);
    next_ += count;
    if (count == 0) {
      hasEnded_ = true;
      piece_[0] = 0xFF;
      piece_[1] = JPEG_EOI;
      count = 2;
    }
    manager_.next_input_byte = piece_.data();
    manager_.bytes_in_buffer = count;
    return TRUE;
  }

  void skip(long count) {
    if (count <= 0) return;
    const auto wanted = static_cast<std::size_t>(count);
    const std::size_t here = std::min(wanted, manager_.bytes_in_buffer);
    manager_.next_input_byte += here;
    manager_.bytes_in_buffer -= here;
    next_ += wanted - here;
  }

  jpeg_source_mgr manager_{};  // first: the library knows this part alone
  const images::ByteSource& source_;
  std::uint64_t next_ = 0;
  bool hasEnded_ = false;
  std::array<JOCTET, kPiece> piece_{};
};

/// Pixel format of planes whose chroma is `across` times narrower and `down` times lower than luma.
std::optional<AVPixelFormat> formatOf(unsigned across, unsigned down) {
  if (across == 1 && down == 1) return AV_PIX_FMT_YUV444P;
  if (across == 2 && down == 1) return AV_PIX_FMT_YUV422P;
  if (across == 2 && down == 2) return AV_PIX_FMT_YUV420P;
  if (across == 1 && down == 2) return AV_PIX_FMT_YUV440P;
  if (across == 4 && down == 1) return AV_PIX_FMT_YUV411P;
  return std::nullopt;
}

class Decoder {
 public:
  explicit Decoder(const images::ByteSource& source) : input_(source) { codec_.err = prepare(errors_); }
  ~Decoder() {
    jpeg_destroy_decompress(&codec_);
    std::free(profile_);  // NOLINT(cppcoreguidelines-no-malloc): as the library allocates it
  }
  Decoder(const Decoder&) = delete;
  Decoder& operator=(const Decoder&) = delete;

  std::optional<Picture> decode(std::uint32_t maximum) {
    if (!readHeader() || !isWithinLimits(codec_.image_width, codec_.image_height)) return std::nullopt;
    scaleDown(maximum);
    Picture picture;
    picture.frame = planesFit() ? decodePlanes() : decodeRows();
    if (!picture.frame) return std::nullopt;
    picture.frame->color_range = AVCOL_RANGE_JPEG;
    if (!isCmyk()) {
      const auto profile = std::as_bytes(std::span(profile_, profileSize_));
      picture.iccProfile.assign(profile.begin(), profile.end());
    }
    return picture;
  }

 private:
  bool readHeader() {
    if (setjmp(errors_.escape) != 0) return false;
    jpeg_create_decompress(&codec_);
    codec_.mem->max_memory_to_use = kMostMemory;
    errors_.manager.emit_message = failWhereTheFileEnds;
    progress_.progress_monitor = failAfterTooManyScans;
    codec_.progress = &progress_;
    input_.attach(codec_);
    jpeg_save_markers(&codec_, JPEG_APP0 + 2, 0xFFFF);  // ICC profiles (ICC.1, B.4)
    jpeg_read_header(&codec_, TRUE);
    jpeg_read_icc_profile(&codec_, &profile_, &profileSize_);
    if (profileSize_ > kLongestProfile) profileSize_ = 0;
    return true;
  }

  /// Damage is what the library makes of it; a picture that is not there in whole is none.
  static void failWhereTheFileEnds(j_common_ptr codec, int level) {
    const auto* input = reinterpret_cast<Input*>(reinterpret_cast<j_decompress_ptr>(codec)->src);
    if (level < 0 && codec->err->msg_code == JWRN_HIT_MARKER && input->hasEnded())
      codec->err->error_exit(codec);
  }

  static void failAfterTooManyScans(j_common_ptr codec) {
    if (reinterpret_cast<j_decompress_ptr>(codec)->input_scan_number > kMostScans)
      codec->err->error_exit(codec);
  }

  /// Eighths by which the transform itself makes the picture smaller. Its filter is coarse, so that it leaves
  /// something to do for the scaler, whose is not: much where that costs little.
  void scaleDown(std::uint32_t maximum) {
    constexpr std::uint32_t kSmall = 512;
    const Extent image{codec_.image_width, codec_.image_height};
    const Extent wanted = fitted(image, maximum);
    const std::uint64_t thirds = std::max(wanted.width, wanted.height) <= kSmall ? 6 : 4;
    const auto covers = [thirds](std::uint64_t side, unsigned eighths, std::uint64_t least) {
      return side * eighths * 3 >= least * DCTSIZE * thirds;
    };
    unsigned eighths = 1;
    while (eighths < DCTSIZE &&
           !(covers(image.width, eighths, wanted.width) && covers(image.height, eighths, wanted.height))) {
      ++eighths;
    }
    codec_.scale_num = eighths;
    codec_.scale_denom = DCTSIZE;
  }

  bool isCmyk() const { return codec_.jpeg_color_space == JCS_CMYK || codec_.jpeg_color_space == JCS_YCCK; }

  std::span<jpeg_component_info> components() {
    return {codec_.comp_info, static_cast<std::size_t>(codec_.num_components)};
  }

  /// Width and height of a component's plane where whole blocks are decoded.
  Extent planeOf(const jpeg_component_info& component) const {
    const auto blocks = [](std::uint64_t side, int largest) {
      const auto unit = static_cast<std::uint64_t>(largest) * DCTSIZE;
      return static_cast<std::uint32_t>((side + unit - 1) / unit);
    };
    return {blocks(codec_.image_width, codec_.max_h_samp_factor) *
                static_cast<std::uint32_t>(component.h_samp_factor * component.DCT_scaled_size),
            blocks(codec_.image_height, codec_.max_v_samp_factor) *
                static_cast<std::uint32_t>(component.v_samp_factor * component.DCT_scaled_size)};
  }

  /// The planes as they are coded make a frame that the scaler takes: no conversion of colours then, and
  /// chroma is scaled but once.
  bool planesFit() {
    if (!calculateSizes()) return false;
    if (codec_.jpeg_color_space == JCS_GRAYSCALE) return takeFormat(AV_PIX_FMT_GRAY8);
    if (codec_.jpeg_color_space != JCS_YCbCr || codec_.num_components != kPlanes) return false;
    const auto parts = components();
    const Extent luma = planeOf(parts[0]);
    const Extent chroma = planeOf(parts[1]);
    const Extent other = planeOf(parts[2]);
    if (chroma.width != other.width || chroma.height != other.height) return false;
    if (luma.width % chroma.width != 0 || luma.height % chroma.height != 0) return false;
    const auto format = formatOf(luma.width / chroma.width, luma.height / chroma.height);
    return format && takeFormat(*format);
  }

  bool calculateSizes() {
    if (setjmp(errors_.escape) != 0) return false;
    jpeg_calc_output_dimensions(&codec_);
    return true;
  }

  bool takeFormat(AVPixelFormat format) {
    format_ = format;
    codec_.raw_data_out = TRUE;
    codec_.out_color_space = codec_.jpeg_color_space;
    return true;
  }

  Frame decodePlanes() {
    const Extent plane = planeOf(components()[0]);
    Frame frame = makeFrame(format_, plane.width, plane.height);
    if (!frame) return nullptr;
    const auto rowsOfAll = rowsOf(*frame);
    if (!readPlanes(rowsOfAll)) return nullptr;
    frame->width = scaled(codec_.image_width);
    frame->height = scaled(codec_.image_height);
    return frame;
  }

  /// A side without the part of a pixel that the transform rounds up to a whole one, if that is a small part.
  int scaled(std::uint64_t side) const {
    return static_cast<int>(std::max<std::uint64_t>(1, (side * codec_.scale_num + DCTSIZE / 2) / DCTSIZE));
  }

  using Rows = std::array<std::vector<JSAMPROW>, kPlanes>;

  Rows rowsOf(const AVFrame& frame) {
    Rows rows;
    for (std::size_t i = 0; i < components().size(); ++i) {
      const std::uint32_t height = planeOf(components()[i]).height;
      for (std::uint32_t row = 0; row < height; ++row) {
        rows[i].push_back(frame.data[i] + static_cast<std::ptrdiff_t>(frame.linesize[i]) * row);
      }
    }
    return rows;
  }

  bool readPlanes(const Rows& rows) {
    if (setjmp(errors_.escape) != 0) return false;
    jpeg_start_decompress(&codec_);
    const auto step = static_cast<JDIMENSION>(codec_.max_v_samp_factor * codec_.min_DCT_scaled_size);
    for (JDIMENSION strip = 0; codec_.output_scanline < codec_.output_height; ++strip) {
      std::array<JSAMPARRAY, kPlanes> planes{};
      for (int i = 0; i < codec_.num_components; ++i) {
        const jpeg_component_info& part = codec_.comp_info[i];
        const std::size_t height = static_cast<unsigned>(part.v_samp_factor * part.DCT_scaled_size);
        planes[static_cast<std::size_t>(i)] =
            const_cast<JSAMPARRAY>(&rows[static_cast<std::size_t>(i)][strip * height]);
      }
      jpeg_read_raw_data(&codec_, planes.data(), step);
    }
    return true;
  }

  Frame decodeRows() {
    codec_.raw_data_out = FALSE;
    codec_.out_color_space = isCmyk() ? JCS_CMYK : JCS_RGB;
    if (!calculateSizes()) return nullptr;
    Frame frame =
        makeFrame(isCmyk() ? AV_PIX_FMT_RGB0 : AV_PIX_FMT_RGB24, codec_.output_width, codec_.output_height);
    return frame && readRows(*frame) ? std::move(frame) : nullptr;
  }

  bool readRows(const AVFrame& frame) {
    if (setjmp(errors_.escape) != 0) return false;
    jpeg_start_decompress(&codec_);
    while (codec_.output_scanline < codec_.output_height) {
      JSAMPROW row = frame.data[0] + static_cast<std::ptrdiff_t>(frame.linesize[0]) * codec_.output_scanline;
      jpeg_read_scanlines(&codec_, &row, 1);
      if (isCmyk()) mixInks(row);
    }
    return true;
  }

  /// Cyan, magenta, yellow and black become red, green and blue in place. Adobe's files say how much paper
  /// shows, others how much ink lies on it.
  void mixInks(JSAMPROW row) const {
    constexpr unsigned kFull = 255;
    const unsigned flip = codec_.saw_Adobe_marker ? 0 : kFull;
    for (auto& pixel : std::span(reinterpret_cast<std::array<JSAMPLE, 4>*>(row), codec_.output_width)) {
      const unsigned paper = pixel[3] ^ flip;
      for (std::size_t i = 0; i < 3; ++i) pixel[i] = static_cast<JSAMPLE>((pixel[i] ^ flip) * paper / kFull);
    }
  }

  Input input_;
  JpegErrors errors_{};
  jpeg_progress_mgr progress_{};
  jpeg_decompress_struct codec_{};
  AVPixelFormat format_ = AV_PIX_FMT_NONE;
  JOCTET* profile_ = nullptr;
  unsigned profileSize_ = 0;
};

std::optional<Picture> decodeEmbedded(const images::ByteSource& source, std::uint32_t maximum) {
  const auto properties = images::copySequentialProperties(source);
  if (!properties || properties->thumbnail.length == 0) return std::nullopt;
  return Decoder(SliceSource(source, properties->thumbnail.offset, properties->thumbnail.length))
      .decode(maximum);
}

}  // namespace

std::optional<Picture> decodeJpeg(const images::ByteSource& source, const ThumbnailRequest& request) {
  if (request.source != ThumbnailSource::full) {
    auto embedded = decodeEmbedded(source, request.maximumPixelSize);
    if (embedded || request.source == ThumbnailSource::embedded) return embedded;
  }
  return Decoder(source).decode(request.maximumPixelSize);
}

}  // namespace brivo::imaging
