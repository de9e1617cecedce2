// SPDX-License-Identifier: MIT
#include "io/file_stream.h"

#include <algorithm>

namespace brivo {

bool FileStream::open(FileSystem& files, const std::string& path) {
  const UnfairLockGuard guard(lock_);
  if (!descriptor_) {
    auto opened = files.open(path);
    UniqueFd fd = opened.ok() ? *std::move(opened) : UniqueFd();
    if (fd.get() == 0) return false;
    descriptor_ = std::make_shared<const UniqueFd>(std::move(fd));
  }
  ++count_;
  return true;
}

bool FileStream::close() {
  Descriptor last;  // closed outside the lock
  const UnfairLockGuard guard(lock_);
  if (count_ == 0) return false;  // a close too many must not upset those to come
  if (--count_ != 0 || !descriptor_) return false;
  last.swap(descriptor_);
  return true;
}

std::int64_t FileStream::read(FileSystem& files, std::span<std::byte> buffer, std::uint64_t offset,
                              std::uint64_t size) const {
  const Descriptor open = descriptor();
  if (!open || offset > size) return 0;
  const std::uint64_t count = std::min<std::uint64_t>(buffer.size(), size - offset);
  return files.read(open->get(), buffer.first(count), offset);
}

std::unique_ptr<ProtectedMapping> FileStream::map(std::size_t length, std::uint64_t offset) const {
  const Descriptor open = descriptor();
  return open ? ProtectedMapping::map(open->get(), length, offset) : nullptr;
}

FileStream::Descriptor FileStream::descriptor() const {
  const UnfairLockGuard guard(lock_);
  return descriptor_;
}

std::uint32_t FileStream::streamCount() const {
  const UnfairLockGuard guard(lock_);
  return count_;
}

}  // namespace brivo
