// SPDX-License-Identifier: MIT
#include "platform/decoding/imaging_service.h"

#include <cstring>
#include <utility>

namespace brivo {

namespace {

/// A file that claims more images is not believed.
constexpr std::uint64_t kMostImages = 65'536;

bool isWhole(const WorkerReply& image) {
  const bool known = image.bytesPerPixel == 1 || image.bytesPerPixel == 4;
  const std::uint64_t pixels = std::uint64_t{image.width} * image.height;
  return known && pixels != 0 && pixels <= kMostResultBytes &&
         pixels * image.bytesPerPixel == image.byteCount;
}

}  // namespace

std::optional<Data> ImagingService::thumbnail(const UniqueFd& file, const ThumbnailRequest& request) {
  WorkerRequest wanted;
  wanted.operation = WorkerOperation::thumbnail;
  wanted.maximumPixelSize = request.maximumPixelSize;
  wanted.source = static_cast<std::uint32_t>(request.source);
  wanted.hasImageTallerThan = request.imageTallerThan ? 1 : 0;
  wanted.imageTallerThan = request.imageTallerThan.value_or(0);
  return resultOf(workers_.ask(wanted, file));
}

std::vector<std::uint32_t> ImagingService::imageWidths(const UniqueFd& file) {
  WorkerRequest wanted;
  wanted.operation = WorkerOperation::imageWidths;
  const auto data = resultOf(workers_.ask(wanted, file));
  if (!data || data->size() % sizeof(std::uint32_t) != 0) return {};
  std::vector<std::uint32_t> widths(data->size() / sizeof(std::uint32_t));
  if (widths.size() > kMostImages) return {};
  std::memcpy(widths.data(), data->bytes().data(), data->size());
  return widths;
}

std::optional<Image> ImagingService::image(const UniqueFd& file, std::uint32_t index) {
  WorkerRequest wanted;
  wanted.operation = WorkerOperation::image;
  wanted.imageIndex = index;
  auto answer = workers_.ask(wanted, file);
  if (!answer || !isWhole(answer->reply)) return std::nullopt;
  const WorkerReply reply = answer->reply;
  auto pixels = resultOf(std::move(answer));
  if (!pixels) return std::nullopt;
  return Image{reply.width, reply.height, reply.bytesPerPixel, std::move(*pixels)};
}

}  // namespace brivo
