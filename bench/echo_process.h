// SPDX-License-Identifier: MIT
#pragma once

#include <string>

#include "child_process.h"

namespace brivo::bench {

/// A child process that answers each request with the same bytes and does nothing else: what the service's
/// round trips are compared with.
class EchoProcess {
 public:
  /// Answers each `requestSize` bytes with `answer`.
  EchoProcess(std::size_t requestSize, const std::string& answer);

  /// The other end of its socket; once.
  UniqueFd takeSocket() { return process_.takeSocket(); }

 private:
  ChildProcess process_;
};

}  // namespace brivo::bench
