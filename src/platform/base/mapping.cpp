// SPDX-License-Identifier: MIT
#include "platform/base/mapping.h"

#include <sys/mman.h>

#include <utility>

namespace brivo {

Mapping::Mapping(Mapping&& other) noexcept : bytes_(std::exchange(other.bytes_, {})) {}

Mapping& Mapping::operator=(Mapping&& other) noexcept {
  std::swap(bytes_, other.bytes_);
  return *this;
}

Mapping::~Mapping() {
  if (!bytes_.empty()) ::munmap(bytes_.data(), bytes_.size());
}

Mapping Mapping::anonymous(std::size_t size) {
  return map(size, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1);
}

Mapping Mapping::sharedWritable(int fd, std::size_t size) {
  return map(size, PROT_READ | PROT_WRITE, MAP_SHARED, fd);
}

Mapping Mapping::sharedReadable(int fd, std::size_t size, std::uint64_t offset) {
  return map(size, PROT_READ, MAP_SHARED, fd, offset);
}

Mapping Mapping::map(std::size_t size, int protection, int flags, int fd, std::uint64_t offset) {
  if (size == 0) return {};
  void* address = ::mmap(nullptr, size, protection, flags, fd, static_cast<off_t>(offset));
  if (address == MAP_FAILED) return {};
  return Mapping({static_cast<std::byte*>(address), size});
}

}  // namespace brivo
