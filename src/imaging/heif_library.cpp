// SPDX-License-Identifier: MIT
#include "imaging/heif_library.h"

#include <libheif/heif.h>

extern "C" {
#include <libavutil/imgutils.h>
}

#include <algorithm>
#include <span>

#include "imaging/heif_file.h"
#include "imaging/heif_library_codec.h"

namespace brivo::imaging {

namespace {

struct FreeObject {
  void operator()(heif_context* context) const { heif_context_free(context); }
  void operator()(heif_image_handle* handle) const { heif_image_handle_release(handle); }
  void operator()(heif_image* image) const { heif_image_release(image); }
  void operator()(heif_decoding_options* options) const { heif_decoding_options_free(options); }
};
template <class Object>
using Owned = std::unique_ptr<Object, FreeObject>;

/// The file as libheif reads it.
struct Reading {
  const images::ByteSource& source;
  std::uint64_t position = 0;
};

Reading& readingOf(void* userData) { return *static_cast<Reading*>(userData); }

bool isIn(const Reading& reading, std::int64_t position) {
  return position >= 0 && static_cast<std::uint64_t>(position) <= reading.source.size();
}

std::int64_t tell(void* userData) { return static_cast<std::int64_t>(readingOf(userData).position); }

/// 0 for success, as libheif has it; as is the next.
int readBytes(void* data, std::size_t length, void* userData) {
  Reading& reading = readingOf(userData);
  const std::span room(static_cast<std::byte*>(data), length);
  if (!images::readAll(reading.source, room, reading.position)) return 1;
  reading.position += length;
  return 0;
}

int seek(std::int64_t position, void* userData) {
  if (!isIn(readingOf(userData), position)) return 1;
  readingOf(userData).position = static_cast<std::uint64_t>(position);
  return 0;
}

heif_reader_grow_status waitForSize(std::int64_t size, void* userData) {
  return isIn(readingOf(userData), size) ? heif_reader_grow_status_size_reached
                                         : heif_reader_grow_status_size_beyond_eof;
}

constexpr heif_reader kReader{1, tell, readBytes, seek, waitForSize};

bool isOk(const heif_error& error) { return error.code == heif_error_Ok; }

Owned<heif_image_handle> primaryOf(heif_context& context) {
  heif_image_handle* handle = nullptr;
  const bool isFound = isOk(heif_context_get_primary_image_handle(&context, &handle));
  return Owned<heif_image_handle>(isFound ? handle : nullptr);
}

Owned<heif_image_handle> thumbnailOf(const heif_image_handle& master, std::uint32_t id) {
  heif_image_handle* handle = nullptr;
  const bool isFound = isOk(heif_image_handle_get_thumbnail(&master, id, &handle));
  return Owned<heif_image_handle>(isFound ? handle : nullptr);
}

bool isAllowed(int width, int height) {
  return width > 0 && height > 0 &&
         isWithinLimits(static_cast<std::uint64_t>(width), static_cast<std::uint64_t>(height));
}

Owned<heif_image> decode(const heif_image_handle& handle) {
  const Owned<heif_decoding_options> options(heif_decoding_options_alloc());
  if (!options) return nullptr;
  options->ignore_transformations = 1;
  options->convert_hdr_to_8bit = 1;
  heif_image* image = nullptr;
  const bool isDecoded = isOk(
      heif_decode_image(&handle, &image, heif_colorspace_RGB, heif_chroma_interleaved_RGB, options.get()));
  return Owned<heif_image>(isDecoded ? image : nullptr);
}

Frame frameOf(const heif_image& image) {
  const int width = heif_image_get_width(&image, heif_channel_interleaved);
  const int height = heif_image_get_height(&image, heif_channel_interleaved);
  int stride = 0;
  const std::uint8_t* pixels = heif_image_get_plane_readonly(&image, heif_channel_interleaved, &stride);
  if (!pixels || !isAllowed(width, height)) return nullptr;
  Frame frame =
      makeFrame(AV_PIX_FMT_RGB24, static_cast<std::uint32_t>(width), static_cast<std::uint32_t>(height));
  if (!frame) return nullptr;
  frame->colorspace = AVCOL_SPC_RGB;
  frame->color_range = AVCOL_RANGE_JPEG;
  av_image_copy_plane(frame->data[0], frame->linesize[0], pixels, stride, width * 3, height);
  return frame;
}

std::vector<std::byte> profileOf(const heif_image_handle& handle) {
  const std::size_t length = heif_image_handle_get_raw_color_profile_size(&handle);
  if (length > kMostProfileBytes) return {};
  std::vector<std::byte> profile(length);
  return isOk(heif_image_handle_get_raw_color_profile(&handle, profile.data())) ? profile
                                                                                : std::vector<std::byte>();
}

}  // namespace

std::optional<Picture> decodeWithLibheif(const images::ByteSource& source,
                                         std::optional<std::uint32_t> thumbnail) {
  useOurCodecInLibheif();
  Reading reading{source};
  const Owned<heif_context> context(heif_context_alloc());
  if (!context) return std::nullopt;
  heif_context_set_max_decoding_threads(context.get(), 0);
  if (!isOk(heif_context_read_from_reader(context.get(), &kReader, &reading, nullptr))) return std::nullopt;
  Owned<heif_image_handle> handle = primaryOf(*context);
  if (handle && thumbnail) handle = thumbnailOf(*handle, *thumbnail);
  if (!handle ||
      !isAllowed(heif_image_handle_get_width(handle.get()), heif_image_handle_get_height(handle.get())))
    return std::nullopt;
  const auto image = decode(*handle);
  Frame frame = image ? frameOf(*image) : nullptr;
  if (!frame) return std::nullopt;
  return Picture{std::move(frame), profileOf(*handle)};
}

}  // namespace brivo::imaging
