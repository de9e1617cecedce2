// SPDX-License-Identifier: MIT
#include <array>
#include <string_view>

#include "imaging/decode_request.h"
#include "platform/images/heif.h"
#include "platform/images/image_reader.h"

namespace brivo::imaging {

namespace {

using namespace std::string_view_literals;

using Decode = std::optional<Picture>(const images::ByteSource&, const ThumbnailRequest&);

constexpr std::size_t kTold = 16;  // bytes that tell containers apart

bool isHeif(const images::ByteSource& source) {
  images::Parse parse(source, images::Scope::basics);
  return images::isHeif(parse);
}

bool isOfCodecAlone(std::string_view start) {
  return start.starts_with("\x89PNG") || start.starts_with("RIFF") || start.starts_with("GIF8") ||
         start.starts_with("BM") || start.substr(4).starts_with("jP  ") || start.starts_with("\xFF\x4F");
}

/// Where a raw file cannot be decoded, its first directory is not the picture.
bool isCameraRaw(const images::ByteSource& source) {
  const auto properties = images::copyContainerProperties(source);
  return properties && properties->crop;
}

}  // namespace

std::optional<Picture> decodeImage(const images::ByteSource& source, const ThumbnailRequest& request) {
  std::array<char, kTold> bytes{};
  source.read(std::as_writable_bytes(std::span(bytes)), 0);
  const std::string_view start(bytes.data(), bytes.size());
  if (start.starts_with("\xFF\xD8")) return decodeJpeg(source, request);
  if (isHeif(source)) return decodeHeif(source, request);
  if (isOfCodecAlone(start)) return decodeWithCodec(source, request);
  auto raw = decodeRaw(source, request);  // raw files look like TIFF files
  return raw || isCameraRaw(source) ? std::move(raw) : decodeWithCodec(source, request);
}

}  // namespace brivo::imaging
