// SPDX-License-Identifier: MIT
#include "platform/base/memfd.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#ifndef F_SEAL_FUTURE_WRITE
#define F_SEAL_FUTURE_WRITE 0x0010
#endif

namespace brivo {

UniqueFd makeMemfd(const char* name, std::size_t size) {
  UniqueFd fd(::memfd_create(name, MFD_CLOEXEC | MFD_ALLOW_SEALING));
  if (fd && ::ftruncate(fd.get(), static_cast<off_t>(size)) != 0) fd.reset();
  return fd;
}

bool sealForReaders(int fd) {
  constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_FUTURE_WRITE | F_SEAL_SEAL;
  return ::fcntl(fd, F_ADD_SEALS, seals) == 0;
}

bool sealForGood(int fd) {
  return ::fcntl(fd, F_ADD_SEALS, F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_WRITE | F_SEAL_SEAL) == 0;
}

bool sealAgainstShrinking(int fd) { return ::fcntl(fd, F_ADD_SEALS, F_SEAL_SHRINK) == 0; }

std::optional<MemfdStatus> statusOfUnshrinkable(int fd) {
  const int seals = ::fcntl(fd, F_GET_SEALS);  // only memory files have any
  struct stat status {};
  if (seals < 0 || (seals & F_SEAL_SHRINK) == 0 || ::fstat(fd, &status) != 0) return std::nullopt;
  return MemfdStatus{status.st_dev, status.st_ino, static_cast<std::uint64_t>(status.st_size)};
}

}  // namespace brivo
