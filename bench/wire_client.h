// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <deque>
#include <string>
#include <string_view>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

/// The cheapest client that there can be: one blocking socket, requests made beforehand, answers looked at
/// only to see where they end. Throws when the peer hangs up. *Thread-bound.*
class WireClient {
 public:
  /// Over a connected socket on which messages may be sent at once.
  explicit WireClient(UniqueFd socket) : socket_(std::move(socket)) {}
  /// Connects to the unix socket at `path` and authenticates.
  static WireClient authenticated(const std::string& path);

  /// Sends a method call and gives its answer, whole; signals that come before are dropped.
  std::string call(std::string_view interface, std::string_view member, std::string_view signature = "",
                   std::string_view body = "");
  /// Sends a method call and leaves its answer to be received.
  void post(std::string_view interface, std::string_view member, std::string_view signature = "",
            std::string_view body = "");
  /// The same with a descriptor that goes along; it stays the caller's.
  void post(std::string_view interface, std::string_view member, std::string_view signature,
            std::string_view body, int descriptor);
  /// The next answer, whole, valid until the next call; signals that come before are dropped.
  std::string_view receiveAnswer();
  /// The descriptor that came first of those that have not been taken. Throws when there is none.
  UniqueFd takeDescriptor();
  /// Receives messages until `text` has been seen in them so many times.
  void receiveUntil(std::string_view text, std::size_t times);
  /// Drops what arrives until nothing has for a while.
  void dropSignals();

  /// Sends `request` so many times, with at most `outstanding` answers awaited at a time, and waits for all
  /// of them. Milliseconds per answer.
  double roundTrips(std::string request, std::size_t count, std::size_t outstanding);

 private:
  void send(std::string_view bytes) const;
  /// The next whole message, valid until the next call.
  std::string_view receive();
  void receiveMore();

  UniqueFd socket_;
  std::uint32_t lastSerial_ = 0;
  std::string received_;
  std::size_t used_ = 0;
  std::deque<UniqueFd> descriptors_;  // that came with what was received, oldest first
};

// What is under a key in a message that holds it as a variant in a dictionary. Each throws when it is not
// there, or is something else.

/// A text: the first at or behind the place `from`.
std::string textUnder(std::string_view key, std::string_view message, std::size_t from = 0);
/// A number of 64 bits.
std::uint64_t numberUnder(std::string_view key, std::string_view message);
/// Bytes; a view into the message.
std::string_view bytesUnder(std::string_view key, std::string_view message);
/// Whether what is there came as a descriptor.
bool isMemoryUnder(std::string_view key, std::string_view message);
/// How many bytes of a descriptor that came along count.
std::uint64_t memorySizeUnder(std::string_view key, std::string_view message);

}  // namespace brivo::bench
