// SPDX-License-Identifier: MIT
#include <array>
#include <span>
#include <string_view>

#include "imaging/decode_request.h"
#include "platform/images/heif.h"
#include "platform/images/image_reader.h"

namespace brivo::imaging {

namespace {

bool isHeif(const images::ByteSource& source) {
  images::Parse parse(source, images::Scope::basics);
  return images::isHeif(parse);
}

/// TIFF 6.0: the byte order, and 42 in it. Raw files look like this too.
bool isTiff(std::string_view start) { return start.starts_with("II*") || start.starts_with("MM"); }

/// Where a raw file cannot be decoded, its first directory is not the picture.
bool isCameraRaw(const images::ByteSource& source) {
  const auto properties = images::copyContainerProperties(source);
  return properties && properties->crop;
}

}  // namespace

std::optional<Picture> decodeImage(const images::ByteSource& source, const ThumbnailRequest& request) {
  std::array<char, 3> bytes{};
  source.read(std::as_writable_bytes(std::span(bytes)), 0);
  const std::string_view start(bytes.data(), bytes.size());
  if (start.starts_with("\xFF\xD8")) return decodeJpeg(source, request);
  if (isHeif(source)) return decodeHeif(source, request);
  if (!isTiff(start)) {
    if (auto picture = decodeWithCodec(source, request)) return picture;
    return decodeRaw(source, request);
  }
  auto raw = decodeRaw(source, request);
  return raw || isCameraRaw(source) ? std::move(raw) : decodeWithCodec(source, request);
}

}  // namespace brivo::imaging
