// SPDX-License-Identifier: MIT
#include "platform/decoding/worker_process.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <utility>

#include "platform/base/memfd.h"
#include "platform/decoding/process_reference.h"

namespace brivo {

namespace {

using Clock = WorkerProcess::Clock;

bool isReadableBefore(const UniqueFd& socket, Clock::time_point deadline) {
  pollfd source{socket.get(), POLLIN, 0};
  while (true) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
    const int found = ::poll(&source, 1, static_cast<int>(std::max<std::int64_t>(0, left.count())));
    if (found >= 0 || errno != EINTR) return found > 0;
  }
}

/// Receives exactly one Record. Descriptors that come with it are dropped by the kernel. errno tells why not:
/// ECONNRESET when the other side hung up.
template <class Record>
bool receive(const UniqueFd& socket, Clock::time_point deadline, Record& record) {
  if (!isReadableBefore(socket, deadline)) {
    errno = ETIMEDOUT;
    return false;
  }
  const ssize_t size = ::recv(socket.get(), &record, sizeof record, MSG_DONTWAIT | MSG_TRUNC);
  if (size >= 0) errno = size == 0 ? ECONNRESET : EPROTO;
  return size == ssize_t{sizeof record};
}

/// The worker lets the result grow when it takes a request.
bool isTaken(int result) {
  struct stat status {};
  return ::fstat(result, &status) != 0 || status.st_size != 0;
}

/// Nothing that the reply says of the result is believed. Sealing fails while the worker can still write.
bool isSound(const WorkerReply& reply, int result) {
  if (reply.status == WorkerStatus::nothing) return true;
  if (reply.status != WorkerStatus::done || !sealForGood(result)) return false;
  const auto status = statusOfUnshrinkable(result);
  return status && reply.byteCount <= std::min(status->size, kMostResultBytes);
}

}  // namespace

Result<std::unique_ptr<WorkerProcess>> WorkerProcess::start(ChildKeeper& keeper, const std::string& program) {
  std::array<int, 2> ends{};
  if (::socketpair(AF_UNIX, SOCK_SEQPACKET | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    return SystemError{"make a socket for " + program, errno};
  }
  UniqueFd ours(ends[0]);
  auto child = keeper.start(program, UniqueFd(ends[1]));
  if (!child) return child.error();
  return std::unique_ptr<WorkerProcess>(new WorkerProcess(std::move(*child), std::move(ours)));
}

WorkerProcess::~WorkerProcess() { kill(); }

void WorkerProcess::kill() const {
  killReferenced(child_);
  // It may be stuck in the kernel; then the socket would stay open.
  ::shutdown(socket_.get(), SHUT_RDWR);
}

const std::optional<WorkerHello>& WorkerProcess::awaitHello(Clock::time_point deadline) {
  if (hello_) return hello_;
  WorkerHello hello;
  if (receive(socket_, deadline, hello)) hello_ = hello;
  return hello_;
}

/// False when it hung up, or has said something that nobody asked for.
bool WorkerProcess::isSilent() const { return !isReadableBefore(socket_, Clock::time_point()); }

bool WorkerProcess::send(const WorkerRequest& request, int file, int result) const {
  const std::array<int, 2> descriptors{file, result};
  WorkerRequest copy = request;
  iovec part{&copy, sizeof copy};
  alignas(cmsghdr) std::array<std::byte, CMSG_SPACE(sizeof descriptors)> control{};
  msghdr message{};
  message.msg_iov = &part;
  message.msg_iovlen = 1;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  cmsghdr* header = CMSG_FIRSTHDR(&message);
  header->cmsg_level = SOL_SOCKET;
  header->cmsg_type = SCM_RIGHTS;
  header->cmsg_len = CMSG_LEN(sizeof descriptors);
  std::memcpy(CMSG_DATA(header), descriptors.data(), sizeof descriptors);
  return ::sendmsg(socket_.get(), &message, MSG_NOSIGNAL | MSG_DONTWAIT) == ssize_t{sizeof copy};
}

WorkerProcess::Exchange WorkerProcess::exchange(const WorkerRequest& request, int file, int result,
                                                Clock::time_point deadline, WorkerReply& reply) {
  if (!isSilent() || !send(request, file, result)) return Exchange::notTaken;
  ++requestCount_;
  if (!receive(socket_, deadline, reply)) {
    return errno == ECONNRESET && !isTaken(result) ? Exchange::notTaken : Exchange::fault;
  }
  return isSound(reply, result) ? Exchange::done : Exchange::fault;
}

}  // namespace brivo
