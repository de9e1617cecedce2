// SPDX-License-Identifier: MIT
// Thumbnails: an embedded JPEG as it lies in the file, or else a new one of the decoded image.
#include <fmt/format.h>

#include "content/media/brivo_file.h"
#include "io/read_memory.h"
#include "platform/base/paths.h"
#include "platform/decoding/image_decoder.h"
#include "platform/text/unicode.h"
#include "platform/types/file_types.h"
#include "protocol/keys.h"
#include "util/clocks.h"
#include "util/log.h"

namespace brivo {

namespace {

/// An embedded JPEG that claims to be longer is none.
constexpr std::uint32_t kLongestEmbedded = 64 << 20;

/// ISO/IEC 10918-1: every JPEG begins with a start-of-image marker.
bool beginsAsJpeg(const Data& data) { return data.text().starts_with("\xFF\xD8"); }

}  // namespace

void BrivoFile::thumbnailDataWithOptions(const Dictionary& options, const ResultHandler& reply) {
  const auto width =
      static_cast<std::uint32_t>(options.unsignedInteger(keys::kThumbnailMaxPixelSize).value_or(0));
  updateBasicMetadata();
  Dictionary metadata = metadataDict().value_or(Dictionary());
  const Value* stated = imageOrientation() != 0 ? metadata.find("Orientation") : nullptr;
  const auto orientation = stated ? std::optional(*stated) : std::nullopt;
  Dictionary result;
  if (!metadata.empty()) result.set(keys::kMetadata, std::move(metadata));
  if (orientation) result.set("Orientation", *orientation);
  if (auto thumbnail = thumbnailDataForPixelWidth(width)) result.set(keys::kThumb, *std::move(thumbnail));
  reply(std::move(result));
}

std::optional<Data> BrivoFile::thumbnailDataForPixelWidth(std::uint32_t width) {
  startBenchmark();
  std::optional<Data> data =
      type() == kTypeImage ? imageThumbnailDataForPixelWidth(width) : movieThumbnailDataForPixelWidth(width);
  const std::string response =
      fmt::format("[subImage] {:>10}: [{:>10}b]", "response", data ? data->size() : 0);
  OVLog(name(), "{}", response);
  OVLog(name(), "{}", benchmarkLine(response, stopBenchmark()));
  return data;
}

std::optional<Data> BrivoFile::imageThumbnailDataForPixelWidth(std::uint32_t width) {
  OVLog(name(), "[subImage] {:>10}: [{:>10}(w)]", "request", static_cast<std::int32_t>(width));
  if (const auto embedded = subImageDictForPixelWidth(width)) {
    if (auto data = createThumbnailUsingOffsets(*embedded)) return data;
  }
  return createImageDataForPixelWidth(width);
}

std::optional<Data> BrivoFile::createThumbnailUsingOffsets(const SubImage& image) {
  if (image.JPEGLength == 0 || image.JPEGOffset == 0) return std::nullopt;
  const auto log = [&](const char* what) {
    OVLog(name(), "[subImage] {:>10}: [{:>10}(b)@ {:>10}(o)]", what, image.JPEGLength, image.JPEGOffset);
  };
  log("using");
  if (!openStream()) return std::nullopt;
  auto data = readInside(image.JPEGOffset, image.JPEGLength);
  closeStream();
  if (!data) return std::nullopt;
  const bool valid = beginsAsJpeg(*data);
  log(valid ? "validated" : "invalid");
  return valid ? data : std::nullopt;
}

/// The end is added up in 32 bits; one that wraps around lies beyond what the read gives.
std::optional<Data> BrivoFile::readInside(std::uint32_t offset, std::uint32_t length) const {
  if (size() < offset + length || length > size() || length > kLongestEmbedded) return std::nullopt;
  Data data = device().readMemory().read(*this, offset, length);
  const bool complete = validateReturnDataSize(static_cast<std::int64_t>(data.size()), length);
  return complete ? std::optional(std::move(data)) : std::nullopt;
}

std::optional<Data> BrivoFile::createImageDataForPixelWidth(std::uint32_t width) const {
  const std::string extension = asciiLowerCased(pathExtension(name()));
  const bool hasType = isDecodableImageExtension(extension) || isCameraRawExtension(extension);
  const auto file = device().files().open(path());
  if (!file.ok()) return std::nullopt;
  // Without a type none of the options counts: only what the file holds already is given then.
  return hasType ? device().imageDecoder().thumbnail(*file, {width, ThumbnailSource::full, width})
                 : device().imageDecoder().thumbnail(*file, {0, ThumbnailSource::embedded, width});
}

std::optional<Data> BrivoFile::thumbnailDataUsingSidecarFiles() const {
  const auto parent = device().cameraItemWithObjectID(parentObject());
  if (!parent) return std::nullopt;
  const auto sidecar =
      initForReadingOnlyWithName(std::string(deletingPathExtension(name())) + ".THM", *parent, device());
  if (!sidecar || sidecar->size() > kLongestEmbedded || !sidecar->openStream()) return std::nullopt;
  Data data = device().readMemory().read(*sidecar, 0, static_cast<std::size_t>(sidecar->size()));
  sidecar->closeStream();
  if (data.empty() || data.size() < sidecar->size()) return std::nullopt;
  OVLogVerboseOrDebug(kLogTypeContent, "", "  ✓             [{:>12}] thumbnail using sidecar file", name());
  return data;
}

std::optional<Data> BrivoFile::imageData() {
  const auto length = static_cast<std::uint32_t>(objectCompressedSize());
  if (!openStream()) return std::nullopt;
  Data data = device().readMemory().read(*this, 0, length);
  closeStream();
  return data.empty() ? std::nullopt : std::optional(std::move(data));
}

}  // namespace brivo
