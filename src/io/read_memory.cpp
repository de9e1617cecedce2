// SPDX-License-Identifier: MIT
#include "io/read_memory.h"

#include <vector>

#include "platform/base/memory_file.h"

namespace brivo {

namespace {

/// From here on bytes are read into shared memory: below it their way through the socket costs less.
constexpr std::size_t kWorthSharing = 65'536;

/// What a read gave, nothing when it failed.
std::size_t usable(std::int64_t count) { return count > 0 ? static_cast<std::size_t>(count) : 0; }

}  // namespace

Data ReadMemory::read(const ReadAheadSource& file, std::uint64_t offset, std::size_t length) {
  const auto fill = [&](std::span<std::byte> memory) {
    return usable(file.readStream(memory.first(length), offset));
  };
  if (length < kWorthSharing) {
    std::vector<std::byte> buffer(length);
    buffer.resize(fill(buffer));
    return Data(std::move(buffer));
  }
  if (length <= usual_) {
    auto block = pool_->take();
    const std::size_t count = block ? fill(block->bytes()) : 0;
    return count > 0 ? std::move(*block).send(count) : Data();
  }
  auto memory = MemoryFile::create("brivod-read", length);
  const std::size_t count = memory ? fill(memory->bytes()) : 0;
  return count > 0 ? std::move(*memory).seal(count).value_or(Data()) : Data();
}

}  // namespace brivo
