// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <memory>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"

namespace brivo::zeph {

/// Stands between the socket of a link and sd-bus, for what comes in, and lets through as many descriptors as
/// calls take. Without it libsystemd 252 collects every descriptor that comes with the bytes of an unfinished
/// message, and never closes those of a message that it drops. *Thread-bound* to the I/O thread.
class DescriptorSieve {
 public:
  /// Descriptors that were let through and have not been taken by a call.
  static constexpr std::size_t kMostStray = 16;

  /// Whether what peers send to `socket` has to be sieved: the kernel does not refuse their descriptors
  /// (SO_PASSRIGHTS, Linux 6.16).
  static bool isNeededFor(int socket);

  /// From here on, who reads from the descriptor `reader` reads what has come through: its number stands for
  /// another file. Nothing may have been read in part. `socket` is borrowed, `reader` stays its owner's. No
  /// descriptors are let through unless `takesAny`. A negative errno, with everything as it was, when there
  /// is no descriptor left.
  static Result<std::unique_ptr<DescriptorSieve>, int> open(int socket, int reader, bool takesAny);

  /// Moves on some of what the socket has, when the reader has read all of what came before: 1, or 0 when
  /// there is nothing. Negative errno: -ECONNRESET when the peer has hung up, -ETOOMANYREFS when it sends
  /// more descriptors than are let through.
  int move();
  /// A call has taken a descriptor.
  void taken() { stray_ -= stray_ > 0; }

 private:
  DescriptorSieve(int socket, UniqueFd outlet, bool takesAny);

  const int socket_;
  const UniqueFd outlet_;
  const std::size_t mostStray_;
  std::size_t stray_ = 0;
};

}  // namespace brivo::zeph
