// SPDX-License-Identifier: MIT
// Real processes at the other end of a real socket.
#pragma once

#include <sys/socket.h>
#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

#include "platform/base/unique_fd.h"
#include "platform/identity/audit_token.h"

namespace brivo::test {

/// A socket that listens under a name that nobody else has.
class ListeningSocket {
 public:
  ListeningSocket();

  /// A socket connected to it, which programs that are executed inherit.
  int connect() const;
  /// The next connection, which is waited for, but not for ever.
  UniqueFd accept() const;

 private:
  UniqueFd socket_;
  sockaddr_storage address_{};
  socklen_t size_ = sizeof address_;
};

/// A child process that connects and then does what it is told to; it is killed and reaped at the end.
class Peer {
 public:
  /// Runs `before`, connects, and runs `after`, both in the child. What fails there ends it. Without an
  /// `after`, or when that returns, it waits.
  explicit Peer(const std::function<bool()>& before = nullptr,
                const std::function<bool(int connection)>& after = nullptr);
  ~Peer();
  Peer(const Peer&) = delete;
  Peer& operator=(const Peer&) = delete;

  pid_t pid() const { return pid_; }
  const AuditToken& token() const { return token_; }
  const UniqueFd& connection() const { return connection_; }

  /// Waits until `program` runs in it; false when that does not come to pass.
  bool runs(const std::string& program) const;
  /// Waits until it has ended and its process identifier is free.
  void reap();
  void kill();

 private:
  ListeningSocket socket_;
  pid_t pid_;
  UniqueFd connection_;
  AuditToken token_;
};

/// For Peer: becomes the program with these arguments.
std::function<bool(int)> executing(const std::string& program, std::vector<std::string> arguments);

/// Runs `body` in a child and gives what it returns, which is to be below 100; at least that when it threw or
/// crashed.
int runInChild(const std::function<int()>& body);

/// Moves this process into a user namespace of its own, as its root, and into namespaces of other kinds
/// (unshare(2)). False where that is not allowed.
bool enterUserNamespace(int otherKinds);
/// The same, and goes on as the first process of a process namespace; who called waits outside.
bool enterProcessNamespace(int otherKinds);

/// A program of its own that runs for a thousand seconds when it is given "1000": a copy of /bin/sleep.
std::string makeProgram(const std::string& path);

}  // namespace brivo::test
