// SPDX-License-Identifier: MIT
#include "imaging/whole_file.h"

namespace brivo::imaging {

std::vector<std::byte> wholeFile(const images::ByteSource& source) {
  constexpr std::uint64_t kLongest = std::uint64_t{512} << 20;
  if (source.size() > kLongest) return {};
  std::vector<std::byte> bytes(static_cast<std::size_t>(source.size()));
  return images::readAll(source, bytes, 0) ? bytes : std::vector<std::byte>();
}

}  // namespace brivo::imaging
