// SPDX-License-Identifier: MIT
#include "content/media/file_source.h"

namespace brivo {

std::size_t FileSource::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  if (!descriptor_) {
    auto opened = files_.open(path_);
    descriptor_ = opened.ok() ? *std::move(opened) : UniqueFd();
  }
  if (!*descriptor_) return 0;
  const std::int64_t count = files_.read(descriptor_->get(), buffer, offset);
  return count > 0 ? static_cast<std::size_t>(count) : 0;
}

}  // namespace brivo
