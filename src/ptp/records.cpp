// SPDX-License-Identifier: MIT
#include "ptp/records.h"

#include "platform/base/byte_cursor.h"

namespace brivo {

namespace {

/// Content lengths of a dataset without a name and with the longest one that a file can have.
constexpr std::size_t kLeastContent = 76;
constexpr std::size_t kMostContent = 78 + 2 * 255;
/// How much larger than its content length a dataset is.
constexpr std::size_t kBeyondContent = 8;

bool isContentLength(std::size_t length) {
  return length >= kLeastContent && length <= kMostContent && length % 2 == 0;
}

std::optional<PTPRecord> takeDataset(std::span<const std::byte>& bytes, std::size_t contentLength) {
  const std::size_t size = contentLength + kBeyondContent;
  if (size > bytes.size()) return std::nullopt;
  const auto dataset = bytes.first(size);
  if (!MSObjectInfoDataset::isComplete(dataset)) return std::nullopt;
  bytes = bytes.subspan(size);
  return MSObjectInfoDataset(Data::copyOf(dataset));
}

}  // namespace

std::optional<PTPRecord> takePTPRecord(std::span<const std::byte>& bytes) {
  const std::size_t second = GetIPPacketType(bytes);  // a content length in a dataset
  if (isContentLength(second)) return takeDataset(bytes, second);
  auto container = decodePTPContainer(bytes);
  if (container) bytes = bytes.subspan(container->length);
  return container;
}

}  // namespace brivo
