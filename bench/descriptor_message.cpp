// SPDX-License-Identifier: MIT
#include "descriptor_message.h"

#include <sys/socket.h>

#include <array>
#include <cstring>
#include <stdexcept>

namespace brivo::bench {

namespace {

/// As many as one message of the service has here.
constexpr std::size_t kMostDescriptors = 16;

/// Room for the descriptors of one message.
struct ControlBuffer {
  alignas(cmsghdr) std::array<char, CMSG_SPACE(kMostDescriptors * sizeof(int))> bytes{};
};

void appendDescriptors(const cmsghdr& entry, std::deque<UniqueFd>& descriptors) {
  const std::size_t count = (entry.cmsg_len - CMSG_LEN(0)) / sizeof(int);
  for (std::size_t i = 0; i < count; ++i) {
    int descriptor = -1;
    std::memcpy(&descriptor, CMSG_DATA(&entry) + i * sizeof descriptor, sizeof descriptor);
    descriptors.emplace_back(descriptor);
  }
}

}  // namespace

void sendWithDescriptor(int socket, std::string_view bytes, int descriptor) {
  iovec part{const_cast<char*>(bytes.data()), bytes.size()};
  ControlBuffer control;
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control.bytes.data();
  message.msg_controllen = CMSG_SPACE(sizeof descriptor);
  cmsghdr* entry = CMSG_FIRSTHDR(&message);
  entry->cmsg_level = SOL_SOCKET;
  entry->cmsg_type = SCM_RIGHTS;
  entry->cmsg_len = CMSG_LEN(sizeof descriptor);
  std::memcpy(CMSG_DATA(entry), &descriptor, sizeof descriptor);
  if (::sendmsg(socket, &message, MSG_NOSIGNAL) != static_cast<ssize_t>(bytes.size())) {
    throw std::runtime_error("cannot send a descriptor");
  }
}

std::ptrdiff_t receiveWithDescriptors(int socket, std::span<char> buffer, std::deque<UniqueFd>& descriptors) {
  iovec part{buffer.data(), buffer.size()};
  ControlBuffer control;
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control.bytes.data();
  message.msg_controllen = control.bytes.size();
  const ssize_t count = ::recvmsg(socket, &message, MSG_CMSG_CLOEXEC);
  if (count <= 0) return count;
  for (cmsghdr* entry = CMSG_FIRSTHDR(&message); entry; entry = CMSG_NXTHDR(&message, entry)) {
    if (entry->cmsg_level == SOL_SOCKET && entry->cmsg_type == SCM_RIGHTS) {
      appendDescriptors(*entry, descriptors);
    }
  }
  return count;
}

}  // namespace brivo::bench
