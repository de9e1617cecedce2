// SPDX-License-Identifier: MIT
#include "platform/base/shared_buffer.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include "platform/base/mapping.h"
#include "platform/base/unique_fd.h"

namespace brivo {

namespace {

/// What the kernel says of a memfd that cannot shrink; none for anything else. Only memfds have seals.
std::optional<struct stat> sealedStatus(int fd) {
  const int seals = ::fcntl(fd, F_GET_SEALS);
  struct stat status {};
  if (seals < 0 || (seals & F_SEAL_SHRINK) == 0 || ::fstat(fd, &status) != 0) return std::nullopt;
  return status;
}

}  // namespace

SharedBuffer::SharedBuffer(UniqueFd fd, std::uint64_t size)
    : fd_(std::make_shared<const UniqueFd>(std::move(fd))), size_(size) {}

int SharedBuffer::fd() const { return fd_->get(); }

std::optional<SharedBuffer> SharedBuffer::create(const char* name, std::size_t size) {
  UniqueFd fd(::memfd_create(name, MFD_CLOEXEC | MFD_ALLOW_SEALING));
  if (!fd || ::ftruncate(fd.get(), static_cast<off_t>(size)) != 0 ||
      ::fcntl(fd.get(), F_ADD_SEALS, F_SEAL_SHRINK) != 0) {
    return std::nullopt;
  }
  return SharedBuffer(std::move(fd), size);
}

std::optional<SharedBuffer::Identity> SharedBuffer::identity() const {
  const auto status = sealedStatus(fd());
  return status ? std::optional(Identity(status->st_dev, status->st_ino)) : std::nullopt;
}

Mapping SharedBuffer::mapped(std::size_t size) const {
  const auto status = sealedStatus(fd());
  if (!status || size_ > static_cast<std::uint64_t>(status->st_size) || size > size_) return {};
  return Mapping::sharedWritable(fd(), size);
}

}  // namespace brivo
