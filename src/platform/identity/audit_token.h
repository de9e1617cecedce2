// SPDX-License-Identifier: MIT
// Which process is at the other end of a socket.
#pragma once

#include <cstdint>
#include <memory>

#include "platform/base/unique_fd.h"

namespace brivo {

/// A process as the kernel knew it when it connected. The process identifier alone may come to mean
/// another process; the pidfd never does. *Immutable*; copies share the pidfd.
class AuditToken {
 public:
  /// The process that connected to (or made the pair of) the unix socket `fd`: SO_PEERCRED and
  /// SO_PEERPIDFD (Linux 6.5), else pidfd_open(2) of the credential's process identifier, which
  /// leaves a window in which that could already be another process. Call it right after accept(2).
  static AuditToken ofPeer(int fd);
  /// The process that has the identifier now, which the caller must know to be the right one.
  static AuditToken ofProcess(std::int32_t pid, std::uint32_t uid);
  static AuditToken ofThisProcess();

  /// -1 when the kernel did not tell.
  std::int32_t processIdentifier() const { return pid_; }
  std::uint32_t userIdentifier() const { return uid_; }
  /// Borrowed; -1 when there is none.
  int pidfd() const { return pidfd_ ? pidfd_->get() : -1; }

  /// True while the process has not exited. Without a pidfd nothing can be said, and it is false.
  bool isAlive() const;

 private:
  AuditToken(std::int32_t pid, std::uint32_t uid, UniqueFd pidfd)
      : pid_(pid), uid_(uid), pidfd_(std::make_shared<const UniqueFd>(std::move(pidfd))) {}

  std::int32_t pid_ = -1;
  std::uint32_t uid_ = 0;
  std::shared_ptr<const UniqueFd> pidfd_;
};

}  // namespace brivo
