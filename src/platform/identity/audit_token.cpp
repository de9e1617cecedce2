// SPDX-License-Identifier: MIT
#include "platform/identity/audit_token.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "platform/base/small_file.h"
#include "platform/identity/process_facts.h"

#ifndef SO_PEERPIDFD
#define SO_PEERPIDFD 77
#endif

namespace brivo {

namespace {

UniqueFd openPidfd(pid_t pid) {
  return pid > 0 ? UniqueFd(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0))) : UniqueFd();
}

std::optional<std::string> readProcessFile(const std::string& path) {
  constexpr std::size_t limit = 8192;
  return readSmallFile(UniqueFd(::open(path.c_str(), O_RDONLY | O_CLOEXEC)).get(), limit);
}

std::optional<std::uint64_t> startTimeOf(pid_t pid) {
  const auto text = readProcessFile("/proc/" + std::to_string(pid) + "/stat");
  return text ? startTimeInStat(*text) : std::nullopt;
}

}  // namespace

AuditToken::AuditToken(const Credentials& credentials, UniqueFd pidfd, std::optional<std::uint64_t> startTime)
    : credentials_(credentials),
      pidfd_(std::make_shared<const UniqueFd>(std::move(pidfd))),
      startTime_(startTime) {}

AuditToken AuditToken::ofPeer(int fd) {
  ucred peer{};
  socklen_t size = sizeof peer;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) return AuditToken({}, UniqueFd());
  const Credentials credentials{peer.pid > 0 ? peer.pid : -1, peer.uid};
  int pidfd = -1;
  size = sizeof pidfd;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERPIDFD, &pidfd, &size) == 0)
    return AuditToken(credentials, UniqueFd(pidfd));
  // Any other error is of a peer that has gone, whose process identifier may be somebody else's by now.
  return errno == ENOPROTOOPT ? ofCredentials(credentials) : AuditToken(credentials, UniqueFd());
}

AuditToken AuditToken::ofCredentials(const Credentials& credentials, UniqueFd pidfd) {
  if (!pidfd) pidfd = openPidfd(credentials.pid);
  if (pidfd || credentials.pid <= 0) return AuditToken(credentials, std::move(pidfd));
  return AuditToken(credentials, UniqueFd(), startTimeOf(credentials.pid));
}

AuditToken AuditToken::ofThisProcess() { return ofCredentials({::getpid(), ::getuid()}); }

bool AuditToken::isAlive() const {
  if (startTime_) return startTimeOf(credentials_.pid) == startTime_;
  pollfd exit{pidfd(), POLLIN, 0};
  return exit.fd >= 0 && ::poll(&exit, 1, 0) == 0;
}

std::optional<std::int32_t> AuditToken::currentProcessIdentifier() const {
  if (startTime_) return isAlive() ? std::optional(credentials_.pid) : std::nullopt;
  if (pidfd() < 0) return std::nullopt;
  const auto text = readProcessFile("/proc/self/fdinfo/" + std::to_string(pidfd()));
  return text ? processInFdinfo(*text) : std::nullopt;
}

}  // namespace brivo
