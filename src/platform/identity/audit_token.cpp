// SPDX-License-Identifier: MIT
#include "platform/identity/audit_token.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>

#ifndef SO_PEERPIDFD
#define SO_PEERPIDFD 77
#endif

namespace brivo {

namespace {

UniqueFd openPidfd(pid_t pid) {
  return pid > 0 ? UniqueFd(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0))) : UniqueFd();
}

}  // namespace

AuditToken AuditToken::ofPeer(int fd) {
  ucred peer{};
  socklen_t size = sizeof peer;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &peer, &size) != 0) return AuditToken({}, UniqueFd());
  const Credentials credentials{peer.pid > 0 ? peer.pid : -1, peer.uid, peer.gid};
  int pidfd = -1;
  size = sizeof pidfd;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERPIDFD, &pidfd, &size) == 0)
    return AuditToken(credentials, UniqueFd(pidfd));
  // Any other error is of a peer that has gone, whose process identifier may be somebody else's by now.
  return errno == ENOPROTOOPT ? ofCredentials(credentials) : AuditToken(credentials, UniqueFd());
}

AuditToken AuditToken::ofCredentials(const Credentials& credentials, UniqueFd pidfd) {
  return AuditToken(credentials, pidfd ? std::move(pidfd) : openPidfd(credentials.pid));
}

AuditToken AuditToken::ofThisProcess() { return ofCredentials({::getpid(), ::getuid(), ::getgid()}); }

bool AuditToken::isAlive() const {
  pollfd exit{pidfd(), POLLIN, 0};
  return exit.fd >= 0 && ::poll(&exit, 1, 0) == 0;
}

}  // namespace brivo
