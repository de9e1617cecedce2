// SPDX-License-Identifier: MIT
#include "platform/identity/audit_token.h"

#include <poll.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <unistd.h>

#ifndef SO_PEERPIDFD
#define SO_PEERPIDFD 77
#endif

namespace brivo {

namespace {

UniqueFd openPidfd(pid_t pid) { return UniqueFd(static_cast<int>(::syscall(SYS_pidfd_open, pid, 0))); }

}  // namespace

AuditToken AuditToken::ofPeer(int fd) {
  ucred credentials{-1, static_cast<uid_t>(-1), static_cast<gid_t>(-1)};
  socklen_t size = sizeof credentials;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERCRED, &credentials, &size) != 0 || credentials.pid <= 0) {
    return AuditToken(-1, credentials.uid, UniqueFd());
  }
  int raw = -1;
  size = sizeof raw;
  UniqueFd pidfd;
  if (::getsockopt(fd, SOL_SOCKET, SO_PEERPIDFD, &raw, &size) == 0) {
    pidfd.reset(raw);
  } else {
    pidfd = openPidfd(credentials.pid);
  }
  return AuditToken(credentials.pid, credentials.uid, std::move(pidfd));
}

AuditToken AuditToken::ofProcess(std::int32_t pid, std::uint32_t uid) {
  return AuditToken(pid, uid, openPidfd(pid));
}

AuditToken AuditToken::ofThisProcess() { return ofProcess(::getpid(), ::getuid()); }

bool AuditToken::isAlive() const {
  pollfd exit{pidfd(), POLLIN, 0};
  return exit.fd >= 0 && ::poll(&exit, 1, 0) == 0;
}

}  // namespace brivo
