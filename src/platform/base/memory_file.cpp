// SPDX-License-Identifier: MIT
#include "platform/base/memory_file.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <memory>

#ifndef F_SEAL_FUTURE_WRITE
#define F_SEAL_FUTURE_WRITE 0x0010
#endif

namespace brivo {

namespace {

struct MappedFile {
  UniqueFd fd;
  Mapping mapping;
};

Data dataOf(UniqueFd fd, Mapping mapping, std::size_t size) {
  auto file = std::make_shared<const MappedFile>(MappedFile{std::move(fd), std::move(mapping)});
  const int memfd = file->fd.get();
  const auto bytes = file->mapping.bytes().first(size);
  return Data(bytes, std::move(file), memfd);
}

}  // namespace

std::optional<MemoryFile> MemoryFile::create(const char* name, std::size_t size) {
  UniqueFd fd(::memfd_create(name, MFD_CLOEXEC | MFD_ALLOW_SEALING));
  if (!fd || ::ftruncate(fd.get(), static_cast<off_t>(size)) != 0) return std::nullopt;
  Mapping mapping = Mapping::sharedWritable(fd.get(), size);
  if (!mapping) return std::nullopt;
  return MemoryFile(std::move(fd), std::move(mapping));
}

std::optional<Data> MemoryFile::seal(std::size_t used) && {
  constexpr int seals = F_SEAL_SHRINK | F_SEAL_GROW | F_SEAL_FUTURE_WRITE | F_SEAL_SEAL;
  if (::fcntl(fd_.get(), F_ADD_SEALS, seals) != 0) return std::nullopt;
  const std::size_t size = std::min(used, mapping_.size());
  return dataOf(std::move(fd_), std::move(mapping_), size);
}

std::optional<Data> dataFromSealedMemfd(UniqueFd fd, std::size_t size) {
  if (size == 0) return Data();
  const int seals = ::fcntl(fd.get(), F_GET_SEALS);
  struct stat status {};
  if (seals < 0 || (seals & F_SEAL_SHRINK) == 0 || ::fstat(fd.get(), &status) != 0 ||
      size > static_cast<std::size_t>(status.st_size)) {
    return std::nullopt;
  }
  Mapping mapping = Mapping::sharedReadable(fd.get(), size);
  if (!mapping) return std::nullopt;
  return dataOf(std::move(fd), std::move(mapping), size);
}

}  // namespace brivo
