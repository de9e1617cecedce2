// SPDX-License-Identifier: MIT
// Which process is at the other end of a socket.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>

#include "platform/base/unique_fd.h"

namespace brivo {

/// A process as the kernel knew it when it connected. The process identifier alone may come to mean another
/// process; the pidfd never does. Where none can be had, the time at which the process was started tells it
/// from a later one with its identifier. *Immutable*; copies share the pidfd.
class AuditToken {
 public:
  /// As in SCM_CREDENTIALS (unix(7)); -1 for what is not known.
  struct Credentials {
    std::int32_t pid = -1;
    std::uint32_t uid = static_cast<std::uint32_t>(-1);
  };

  /// The process that connected to (or made the pair of) the unix socket `fd`: SO_PEERCRED and
  /// SO_PEERPIDFD (Linux 6.5), else pidfd_open(2) of the credential's process identifier, which
  /// leaves a window in which that could already be another process. Call it right after accept(2).
  static AuditToken ofPeer(int fd);
  /// The process that somebody trusted vouches for, such as a message bus for one of its clients. Without a
  /// `pidfd` it is the process that has the identifier now, which the caller must know to be the right one.
  static AuditToken ofCredentials(const Credentials& credentials, UniqueFd pidfd = UniqueFd());
  static AuditToken ofThisProcess();

  /// -1 when the kernel did not tell.
  std::int32_t processIdentifier() const { return credentials_.pid; }
  std::uint32_t userIdentifier() const { return credentials_.uid; }
  /// Borrowed; -1 when there is none.
  int pidfd() const { return pidfd_->get(); }

  /// True while the process has not exited. Of an unknown process nothing can be said, and it is false.
  bool isAlive() const;
  /// The number of its folder in /proc, which is its own for as long as it is alive: look there first and ask
  /// isAlive() afterwards. None for a process that has exited, or that has no number in our namespace.
  std::optional<std::int32_t> currentProcessIdentifier() const;

 private:
  AuditToken(const Credentials& credentials, UniqueFd pidfd,
             std::optional<std::uint64_t> startTime = std::nullopt);

  Credentials credentials_;
  std::shared_ptr<const UniqueFd> pidfd_;
  std::optional<std::uint64_t> startTime_;  // known only where there is no pidfd
};

}  // namespace brivo
