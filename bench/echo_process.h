// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

/// A child process that answers each request with the same bytes and does nothing else: what the service's
/// round trips are compared with.
class EchoProcess {
 public:
  /// Answers each `requestSize` bytes with `answer`.
  EchoProcess(std::size_t requestSize, const std::string& answer);
  ~EchoProcess();
  EchoProcess(const EchoProcess&) = delete;
  EchoProcess& operator=(const EchoProcess&) = delete;

  /// The other end of its socket; once.
  UniqueFd takeSocket() { return std::move(socket_); }

 private:
  UniqueFd socket_;
  pid_t pid_ = -1;
};

}  // namespace brivo::bench
