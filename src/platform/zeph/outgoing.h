// SPDX-License-Identifier: MIT
// A message that waits to be put on the wire.
#pragma once

#include <chrono>
#include <cstdint>
#include <memory>
#include <variant>

#include "platform/zeph/connection.h"

namespace brivo::zeph {

/// Sent by the service, never answered.
struct OutgoingSignal {
  const Member* member;
  std::shared_ptr<const Arguments> arguments;
};

/// The answer to the call that the link named with `token`.
struct OutgoingAnswer {
  std::uint64_t token;
  Answer answer;
};

/// Sent by the client.
struct OutgoingCall {
  const Member* member;
  Arguments arguments;
  std::chrono::steady_clock::time_point deadline;  ///< of the answer
  AnswerHandler onAnswer;
};

struct Outgoing {
  std::variant<OutgoingSignal, OutgoingAnswer, OutgoingCall> message;
  /// What the message is charged with until it has left.
  std::size_t weight;
};

}  // namespace brivo::zeph
