// SPDX-License-Identifier: MIT
#include "platform/base/memory_pool.h"

#include <fcntl.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <string>
#include <utility>

#include "platform/base/memfd.h"

namespace brivo {

namespace {

/// The same file once more, as an open file description of its own. Needs /proc.
UniqueFd reopened(const UniqueFd& fd, int flags) {
  return UniqueFd(::open(("/proc/self/fd/" + std::to_string(fd.get())).c_str(), flags | O_CLOEXEC));
}

}  // namespace

/// What a Data made of a block holds: gives the block back when it goes.
struct MemoryPool::Sent {
  Sent(std::shared_ptr<MemoryPool> from, std::unique_ptr<Memory> sent, UniqueFd readable)
      : pool(std::move(from)), memory(std::move(sent)), fd(std::move(readable)) {}
  ~Sent() {
    fd.reset();  // first, or the pool would count it as somebody else's
    pool->giveBack(std::move(memory));
  }
  Sent(const Sent&) = delete;
  Sent& operator=(const Sent&) = delete;

  std::shared_ptr<MemoryPool> pool;
  std::unique_ptr<Memory> memory;
  UniqueFd fd;
};

MemoryPool::Block::~Block() {
  if (memory_) pool_->giveBack(std::move(memory_));
}

Data MemoryPool::Block::send(std::size_t used) && {
  UniqueFd readable = reopened(memory_->fd, O_RDONLY);
  if (!readable) readable = memory_->fd.duplicate();
  if (!readable) return {};
  const auto bytes = memory_->mapping.bytes().first(std::min(used, memory_->mapping.size()));
  auto sent = std::make_shared<const Sent>(pool_, std::move(memory_), std::move(readable));
  const int memfd = sent->fd.get();
  return Data(bytes, std::move(sent), memfd);
}

std::shared_ptr<MemoryPool> MemoryPool::create(const char* name, std::size_t blockSize, std::size_t keep) {
  return std::shared_ptr<MemoryPool>(new MemoryPool(name, blockSize, keep));
}

std::optional<MemoryPool::Block> MemoryPool::take() {
  std::unique_ptr<Memory> memory;
  {
    const MutexLock lock(mutex_);
    const auto free = std::ranges::find_if(returned_, [](const auto& one) { return isOursAlone(*one); });
    if (free != returned_.end()) {
      memory = std::move(*free);
      returned_.erase(free);
    }
  }
  if (!memory) memory = makeMemory(name_, blockSize_);
  if (!memory) return std::nullopt;
  return Block(shared_from_this(), std::move(memory));
}

void MemoryPool::trim() {
  std::deque<std::unique_ptr<Memory>> surplus;  // freed outside the lock
  const MutexLock lock(mutex_);
  surplus.swap(returned_);
}

void MemoryPool::giveBack(std::unique_ptr<Memory> memory) {
  std::unique_ptr<Memory> surplus;  // freed outside the lock
  if (!kernelTellsWhoReads()) return;
  const MutexLock lock(mutex_);
  returned_.push_back(std::move(memory));
  if (returned_.size() <= keep_) return;
  surplus = std::move(returned_.front());
  returned_.pop_front();
}

std::unique_ptr<MemoryPool::Memory> MemoryPool::makeMemory(const char* name, std::size_t size) {
  UniqueFd fd = makeMemfd(name, size);
  if (!fd) return nullptr;
  // What memfd_create() opens is not counted among the writers, and then no lease is granted.
  if (UniqueFd counted = reopened(fd, O_RDWR)) fd = std::move(counted);
  Mapping mapping = Mapping::sharedWritable(fd.get(), size);
  if (!mapping || !sealForReaders(fd.get())) return nullptr;
  // Somebody who opens the file at the moment of isOursAlone() breaks the lease: a signal that ends nobody.
  ::fcntl(fd.get(), F_SETSIG, SIGURG);
  return std::make_unique<Memory>(Memory{std::move(fd), std::move(mapping)});
}

/// The kernel grants a write lease only while the file has no other open file description: no descriptor, no
/// mapping, none on its way through a socket (fcntl(2), F_SETLEASE).
bool MemoryPool::isOursAlone(const Memory& memory) {
  if (::fcntl(memory.fd.get(), F_SETLEASE, F_WRLCK) != 0) return false;
  ::fcntl(memory.fd.get(), F_SETLEASE, F_UNLCK);
  return true;
}

/// Tried out once: a lease that is granted too easily would change bytes under a reader.
bool MemoryPool::kernelTellsWhoReads() {
  static const bool tells = [] {
    constexpr std::size_t kTrialSize = 4096;
    const auto trial = makeMemory("brivod-trial", kTrialSize);
    UniqueFd reader = trial ? reopened(trial->fd, O_RDONLY) : UniqueFd();
    if (!reader) return false;
    const bool seesDescriptor = !isOursAlone(*trial);
    Mapping mapping = Mapping::sharedReadable(reader.get(), kTrialSize);
    reader.reset();
    const bool seesMapping = mapping && !isOursAlone(*trial);
    mapping = Mapping();
    return seesDescriptor && seesMapping && isOursAlone(*trial);
  }();
  return tells;
}

}  // namespace brivo
