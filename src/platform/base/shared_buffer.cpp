// SPDX-License-Identifier: MIT
#include "platform/base/shared_buffer.h"

#include "platform/base/mapping.h"
#include "platform/base/memfd.h"
#include "platform/base/unique_fd.h"

namespace brivo {

SharedBuffer::SharedBuffer(UniqueFd fd, std::uint64_t size)
    : fd_(std::make_shared<const UniqueFd>(std::move(fd))), size_(size) {}

int SharedBuffer::fd() const { return fd_->get(); }

std::optional<SharedBuffer> SharedBuffer::create(const char* name, std::size_t size) {
  UniqueFd fd = makeMemfd(name, size);
  if (!fd || !sealAgainstShrinking(fd.get())) return std::nullopt;
  return SharedBuffer(std::move(fd), size);
}

std::optional<SharedBuffer::Identity> SharedBuffer::identity() const {
  const auto status = statusOfUnshrinkable(fd());
  return status ? std::optional(Identity(status->device, status->inode)) : std::nullopt;
}

Mapping SharedBuffer::mapped(std::size_t size) const {
  const auto status = statusOfUnshrinkable(fd());
  if (!status || size_ > status->size || size > size_) return {};
  return Mapping::sharedWritable(fd(), size);
}

}  // namespace brivo
