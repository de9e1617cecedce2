// SPDX-License-Identifier: MIT
#include "platform/zeph/descriptor_sieve.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <span>

#include "platform/zeph/pass_rights.h"

namespace brivo::zeph {

namespace {

/// Far less than a socket takes of which everything has been read.
constexpr std::size_t kChunk = 32768;

/// Bytes, and the descriptors that come with them.
class Chunk {
 public:
  /// The bytes go to `memory`.
  Chunk(std::span<std::byte> memory, std::size_t mostDescriptors)
      : controlSize_(mostDescriptors > 0 ? CMSG_SPACE(mostDescriptors * sizeof(int)) : 0),
        data_{memory.data(), memory.size()} {}
  ~Chunk() {
    for (std::size_t i = 0; i < descriptors(); ++i) ::close(descriptor(i));
  }
  Chunk(const Chunk&) = delete;
  Chunk& operator=(const Chunk&) = delete;

  ssize_t receive(int socket) {
    header_.msg_control = controlSize_ > 0 ? control_.data() : nullptr;
    header_.msg_controllen = controlSize_;
    const ssize_t size = ::recvmsg(socket, &header_, MSG_DONTWAIT | MSG_CMSG_CLOEXEC);
    if (size < 0) header_.msg_controllen = 0;
    return size;
  }
  ssize_t send(int socket, std::size_t size) {
    data_.iov_len = size;
    return ::sendmsg(socket, &header_, MSG_DONTWAIT | MSG_NOSIGNAL);
  }

  /// There were more; the kernel has closed them.
  bool hasLostDescriptors() const { return (header_.msg_flags & MSG_CTRUNC) != 0; }
  std::size_t descriptors() const {
    const cmsghdr* entry = CMSG_FIRSTHDR(&header_);
    return entry && entry->cmsg_type == SCM_RIGHTS ? (entry->cmsg_len - CMSG_LEN(0)) / sizeof(int) : 0;
  }

 private:
  int descriptor(std::size_t index) const {
    int fd = -1;
    std::memcpy(&fd, CMSG_DATA(CMSG_FIRSTHDR(&header_)) + index * sizeof fd, sizeof fd);
    return fd;
  }

  const std::size_t controlSize_;
  alignas(cmsghdr) std::array<std::byte, CMSG_SPACE(DescriptorSieve::kMostStray * sizeof(int))> control_{};
  iovec data_;
  msghdr header_{nullptr, 0, &data_, 1, nullptr, 0, 0};
};

}  // namespace

bool DescriptorSieve::isNeededFor(int socket) {
  int passes = 1;
  socklen_t size = sizeof passes;
  return ::getsockopt(socket, SOL_SOCKET, SO_PASSRIGHTS, &passes, &size) != 0 || passes != 0;
}

Result<std::unique_ptr<DescriptorSieve>, int> DescriptorSieve::open(int socket, int reader, bool takesAny) {
  int ends[2];
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends) != 0) return -errno;
  const UniqueFd inlet(ends[0]);
  UniqueFd outlet(ends[1]);
  if (::dup3(inlet.get(), reader, O_CLOEXEC) < 0) return -errno;
  return std::unique_ptr<DescriptorSieve>(new DescriptorSieve(socket, std::move(outlet), takesAny));
}

DescriptorSieve::DescriptorSieve(int socket, UniqueFd outlet, bool takesAny)
    : socket_(socket), outlet_(std::move(outlet)), mostStray_(takesAny ? kMostStray : 0) {}

int DescriptorSieve::move() {
  thread_local std::array<std::byte, kChunk> memory{};
  Chunk chunk(memory, mostStray_);
  const ssize_t size = chunk.receive(socket_);
  if (size == 0) return -ECONNRESET;
  if (size < 0) return errno == EAGAIN || errno == EINTR ? 0 : -errno;
  stray_ += chunk.descriptors();
  if (chunk.hasLostDescriptors() || stray_ > mostStray_) return -ETOOMANYREFS;
  const ssize_t sent = chunk.send(outlet_.get(), static_cast<std::size_t>(size));
  if (sent < 0) return -errno;
  return sent == size ? 1 : -ENOBUFS;
}

}  // namespace brivo::zeph
