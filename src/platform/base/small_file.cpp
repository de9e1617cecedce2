// SPDX-License-Identifier: MIT
#include "platform/base/small_file.h"

#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace brivo {

std::optional<std::string> readSmallFile(int fd, std::size_t limit) {
  struct stat status {};
  if (::fstat(fd, &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  std::string text;
  std::array<char, 4096> part{};
  for (;;) {
    const ssize_t size = ::read(fd, part.data(), part.size());
    if (size < 0 && errno == EINTR) continue;
    if (size < 0) return std::nullopt;
    if (size == 0) return text;
    text.append(part.data(), static_cast<std::size_t>(size));
    if (text.size() > limit) return std::nullopt;
  }
}

}  // namespace brivo
