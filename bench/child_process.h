// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <functional>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

/// A forked copy of this program that does one piece of work, with a unix stream socket between the two. It
/// goes with this program. *Thread-bound.*
class ChildProcess {
 public:
  /// Runs `work` in the child, with the child's end of the socket. The child ends with it; what it throws is
  /// shown, and then, as always, this program sees the child hang up. Throws when there is no child.
  explicit ChildProcess(const std::function<void(int socket)>& work);
  /// Ends the child.
  ~ChildProcess();
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;

  /// This program's end of the socket, borrowed.
  int socket() const { return socket_.get(); }
  /// The same end to keep; once.
  UniqueFd takeSocket() { return std::move(socket_); }

 private:
  UniqueFd socket_;
  pid_t pid_ = -1;
};

}  // namespace brivo::bench
