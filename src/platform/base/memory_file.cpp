// SPDX-License-Identifier: MIT
#include "platform/base/memory_file.h"

#include <algorithm>
#include <memory>

#include "platform/base/memfd.h"

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
  UniqueFd fd = makeMemfd(name, size);
  if (!fd) return std::nullopt;
  Mapping mapping = Mapping::sharedWritable(fd.get(), size);
  if (!mapping) return std::nullopt;
  return MemoryFile(std::move(fd), std::move(mapping));
}

std::optional<Data> MemoryFile::seal(std::size_t used) && {
  if (!sealForReaders(fd_.get())) return std::nullopt;
  const std::size_t size = std::min(used, mapping_.size());
  return dataOf(std::move(fd_), std::move(mapping_), size);
}

std::optional<Data> dataFromSealedMemfd(UniqueFd fd, std::size_t size) {
  if (size == 0) return Data();
  const auto status = statusOfUnshrinkable(fd.get());
  if (!status || size > status->size) return std::nullopt;
  Mapping mapping = Mapping::sharedReadable(fd.get(), size);
  if (!mapping) return std::nullopt;
  return dataOf(std::move(fd), std::move(mapping), size);
}

}  // namespace brivo
