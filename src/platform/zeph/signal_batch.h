// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <string_view>
#include <vector>

#include "platform/zeph/outgoing.h"

namespace brivo::zeph {

/// Signals on their way to one socket, marshalled one behind the other (D-Bus Specification, "Message
/// Format") and written with one system call: a catalogue is very many small signals, and most of what each
/// costs is the call. *Thread-bound* to the I/O thread.
class SignalBatch {
 public:
  enum class Written { all, some, hungUp };

  /// Appends a signal of `interface` that is charged with `weight`; false, with nothing appended, when its
  /// arguments do not fit its signature. It must need no descriptor.
  bool append(const OutgoingSignal& signal, const char* interface, std::size_t weight);
  /// Writes what `fd` takes without waiting.
  Written writeTo(int fd);

  bool empty() const { return waiting_.empty(); }
  /// So much waits that it should be written before more is appended.
  bool isFull() const;
  /// A message has been written in part: nobody else may write to the socket before writeTo() has gone on.
  bool isInsideMessage() const;

  /// How many messages, with what weight together, have been written since this was last asked.
  struct Left {
    std::size_t messages = 0;
    std::size_t weight = 0;
  };
  Left takeLeft();

 private:
  struct Waiting {
    std::size_t end;  ///< in bytes_
    std::size_t weight;
  };

  std::vector<std::byte> bytes_;
  std::size_t written_ = 0;   ///< of bytes_
  std::size_t boundary_ = 0;  ///< where the first message that waits begins
  std::deque<Waiting> waiting_;
  Left left_;
  std::uint32_t lastSerial_ = 0;
};

}  // namespace brivo::zeph
