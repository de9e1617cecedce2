// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <string>

#include "child_process.h"

namespace brivo::bench {

/// How new memory is filled from a file.
enum class Filling { byMapping, bySendfile };

/// A child process that answers each request for a part of a file with a memory file made for it alone,
/// filled, sealed and sent as a descriptor, and does nothing else: what the service's streams are compared
/// with. *Thread-bound.*
class FreshMemoryProcess {
 public:
  FreshMemoryProcess(const std::string& path, Filling filling);

  /// `length` bytes of the file from `offset` on, which it must have. Throws when the child fails.
  UniqueFd part(std::uint64_t offset, std::uint64_t length);

 private:
  ChildProcess process_;
};

}  // namespace brivo::bench
