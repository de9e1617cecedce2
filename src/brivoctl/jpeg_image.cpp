// SPDX-License-Identifier: MIT
#include "brivoctl/jpeg_image.h"

// clang-format off: the library's header needs the one before it
#include <jerror.h>
#include <jpeglib.h>
#include <cstdio>
// clang-format on

#include <algorithm>
#include <bit>
#include <csetjmp>
#include <memory>

namespace brivoctl {

namespace {

static_assert(JPEG_MAX_DIMENSION == kLongestJpegSide);

constexpr std::uint64_t kMostPixels = 100'000'000;
constexpr long kMostMemory = 268'435'456;  // bytes, beside the pixels
/// A picture has some ten; each of a hostile one's takes the time of the whole picture.
constexpr int kMostScans = 100;
constexpr int kQuality = 90;
constexpr J_COLOR_SPACE kPixelLayout =
    std::endian::native == std::endian::little ? JCS_EXT_BGRA : JCS_EXT_ARGB;

/// Where a failure goes, and whether one was passed over. The library jumps out of its calls, so that what
/// calls it holds plain data alone and leaves nothing undone.
struct Failures {
  jpeg_error_mgr manager;
  std::jmp_buf target;
  bool isDamaged;
};

struct Decoder {
  jpeg_decompress_struct info;
  jpeg_progress_mgr progress;
  Failures failures;
};

struct Encoder {
  jpeg_compress_struct info;  // first, so that the library's callbacks find the rest
  jpeg_destination_mgr destination;
  Failures failures;
  JOCTET piece[65'536];
  std::vector<std::byte>* bytes;
};

[[noreturn]] void fail(j_common_ptr info) {
  std::longjmp(static_cast<Failures*>(info->client_data)->target, 1);
}

/// Bytes before a marker and versions from the future are nobody's loss; missing and wrong codes are.
void note(j_common_ptr info, int level) {
  if (level >= 0) return;
  const int code = info->err->msg_code;
  if (code == JWRN_HIT_MARKER || code == JWRN_HUFF_BAD_CODE || code == JWRN_MUST_RESYNC)
    static_cast<Failures*>(info->client_data)->isDamaged = true;
}

void sayNothing(j_common_ptr) {}

jpeg_error_mgr* prepared(Failures& failures) {
  jpeg_error_mgr* manager = jpeg_std_error(&failures.manager);
  manager->error_exit = fail;
  manager->emit_message = note;
  manager->output_message = sayNothing;
  failures.isDamaged = false;
  return manager;
}

void limitScans(j_common_ptr info) {
  const auto* decoder = static_cast<const jpeg_decompress_struct*>(static_cast<const void*>(info));
  if (decoder->input_scan_number > kMostScans) fail(info);
}

/// The largest of the library's reductions that leaves a longest side of `longestSide`.
unsigned int reduction(const jpeg_decompress_struct& info, std::uint32_t longestSide) {
  unsigned int steps = 8;
  while (steps > 1 && std::max(info.image_width, info.image_height) / steps < longestSide) steps /= 2;
  return steps;
}

/// Reads up to the first row; afterwards `info` has the output's size.
bool begin(Decoder& decoder, std::span<const std::byte> jpeg, std::uint32_t longestSide) {
  jpeg_decompress_struct& info = decoder.info;
  info.err = prepared(decoder.failures);
  info.client_data = &decoder.failures;
  if (setjmp(decoder.failures.target) != 0) return false;
  jpeg_create_decompress(&info);
  info.mem->max_memory_to_use = kMostMemory;
  decoder.progress.progress_monitor = limitScans;
  info.progress = &decoder.progress;
  jpeg_mem_src(&info, reinterpret_cast<const unsigned char*>(jpeg.data()), jpeg.size());
  jpeg_read_header(&info, TRUE);
  if (std::uint64_t{info.image_width} * info.image_height > kMostPixels) return false;
  info.scale_num = 1;
  info.scale_denom = reduction(info, longestSide);
  info.out_color_space = kPixelLayout;
  return jpeg_start_decompress(&info) == TRUE;
}

bool readRows(Decoder& decoder, std::span<std::uint32_t> pixels) {
  jpeg_decompress_struct& info = decoder.info;
  if (setjmp(decoder.failures.target) != 0) return false;
  while (info.output_scanline < info.output_height) {
    const std::size_t from = std::size_t{info.output_scanline} * info.output_width;
    JSAMPROW row = reinterpret_cast<JSAMPROW>(pixels.subspan(from, info.output_width).data());
    jpeg_read_scanlines(&info, &row, 1);
  }
  return !decoder.failures.isDamaged;
}

Encoder& encoderOf(j_compress_ptr info) { return *static_cast<Encoder*>(static_cast<void*>(info)); }

void beginPiece(j_compress_ptr info) {
  Encoder& encoder = encoderOf(info);
  encoder.destination.next_output_byte = encoder.piece;
  encoder.destination.free_in_buffer = sizeof encoder.piece;
}

void keepPiece(j_compress_ptr info, std::size_t count) {
  const Encoder& encoder = encoderOf(info);
  const auto piece = std::as_bytes(std::span(encoder.piece)).first(count);
  encoder.bytes->insert(encoder.bytes->end(), piece.begin(), piece.end());
}

boolean keepFullPiece(j_compress_ptr info) {
  keepPiece(info, sizeof Encoder::piece);
  beginPiece(info);
  return TRUE;
}

void keepLastPiece(j_compress_ptr info) {
  keepPiece(info, sizeof Encoder::piece - info->dest->free_in_buffer);
}

bool writeRows(Encoder& encoder, PictureSize size, std::span<const std::uint32_t> pixels) {
  jpeg_compress_struct& info = encoder.info;
  info.err = prepared(encoder.failures);
  info.client_data = &encoder.failures;
  if (setjmp(encoder.failures.target) != 0) return false;
  jpeg_create_compress(&info);
  encoder.destination.init_destination = beginPiece;
  encoder.destination.empty_output_buffer = keepFullPiece;
  encoder.destination.term_destination = keepLastPiece;
  info.dest = &encoder.destination;
  info.image_width = size.width;
  info.image_height = size.height;
  info.input_components = 4;
  info.in_color_space = kPixelLayout;
  jpeg_set_defaults(&info);
  jpeg_set_quality(&info, kQuality, TRUE);
  jpeg_start_compress(&info, TRUE);
  while (info.next_scanline < info.image_height) {
    const auto source = pixels.subspan(std::size_t{info.next_scanline} * size.width, size.width);
    JSAMPROW row = reinterpret_cast<JSAMPROW>(const_cast<std::uint32_t*>(source.data()));  // only read
    jpeg_write_scanlines(&info, &row, 1);
  }
  jpeg_finish_compress(&info);
  return true;
}

}  // namespace

std::optional<Picture> decodeJpeg(std::span<const std::byte> jpeg, std::uint32_t longestSide) {
  if (jpeg.empty()) return std::nullopt;
  Decoder decoder{};
  Picture picture;
  bool isWhole = begin(decoder, jpeg, longestSide);
  if (isWhole) {
    picture.size = {decoder.info.output_width, decoder.info.output_height};
    picture.pixels.resize(std::size_t{picture.size.width} * picture.size.height);
    isWhole = readRows(decoder, picture.pixels);
  }
  jpeg_destroy_decompress(&decoder.info);
  return isWhole ? std::optional(std::move(picture)) : std::nullopt;
}

std::optional<brivo::Data> encodeJpeg(const Picture& picture) {
  std::vector<std::byte> bytes;
  const auto encoder = std::make_unique<Encoder>();
  encoder->bytes = &bytes;
  const bool isWritten = writeRows(*encoder, picture.size, picture.pixels);
  jpeg_destroy_compress(&encoder->info);
  return isWritten ? std::optional(brivo::Data(std::move(bytes))) : std::nullopt;
}

}  // namespace brivoctl
