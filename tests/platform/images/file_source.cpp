// SPDX-License-Identifier: MIT
#include "file_source.h"

#include <fcntl.h>
#include <unistd.h>

#include <stdexcept>

namespace brivo::images {

FileSource::FileSource(const std::filesystem::path& path)
    : file_(::open(path.c_str(), O_RDONLY | O_CLOEXEC)), size_(std::filesystem::file_size(path)) {
  if (!file_) throw std::runtime_error("cannot open " + path.string());
}

std::size_t FileSource::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  ++ranges_;
  bytes_ += buffer.size();
  if (offset > size_ || buffer.size() > size_ - offset) stayedInside_ = false;
  const ssize_t count = ::pread(file_.get(), buffer.data(), buffer.size(), static_cast<off_t>(offset));
  return count > 0 ? static_cast<std::size_t>(count) : 0;
}

}  // namespace brivo::images
