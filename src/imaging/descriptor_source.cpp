// SPDX-License-Identifier: MIT
#include "imaging/descriptor_source.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace brivo::imaging {

DescriptorSource::DescriptorSource(const UniqueFd& file) : file_(file) {
  struct stat status {};
  if (::fstat(file.get(), &status) == 0 && status.st_size > 0)
    size_ = static_cast<std::uint64_t>(status.st_size);
}

std::size_t DescriptorSource::read(std::span<std::byte> buffer, std::uint64_t offset) const {
  std::size_t done = 0;
  while (done < buffer.size()) {
    const ssize_t count =
        ::pread(file_.get(), buffer.data() + done, buffer.size() - done, static_cast<off_t>(offset + done));
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) break;
    done += static_cast<std::size_t>(count);
  }
  return done;
}

}  // namespace brivo::imaging
