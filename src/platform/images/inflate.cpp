// SPDX-License-Identifier: MIT
#include "platform/images/inflate.h"

#include <zlib.h>

namespace brivo::images {

std::vector<std::byte> inflated(std::span<const std::byte> stream, std::size_t most) {
  std::vector<std::byte> bytes(most);
  uLongf length = most;
  const int result = ::uncompress(reinterpret_cast<Bytef*>(bytes.data()), &length,
                                  reinterpret_cast<const Bytef*>(stream.data()), stream.size());
  bytes.resize(result == Z_OK ? length : 0);
  return bytes;
}

}  // namespace brivo::images
