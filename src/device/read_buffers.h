// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <deque>
#include <map>
#include <span>

#include "platform/base/mapping.h"
#include "platform/base/shared_buffer.h"

namespace brivo {

/// The memory that clients offer to have their reads put into. Each piece is mapped once and used for as many
/// reads as the client likes. *Thread-bound* to the device's operation queue.
class ReadBuffers {
 public:
  /// Buffers of one client that stay mapped; one more, and the oldest has to be mapped again for its next
  /// use.
  static constexpr std::size_t kMostPerClient = 32;
  /// What of a buffer is used, in bytes: no read is longer.
  static constexpr std::size_t kMostBytes = 4'194'304;

  /// The first `length` bytes of `buffer`, valid until the next call. Empty unless the buffer is a memfd that
  /// is sealed against shrinking, can be written into and holds as many bytes.
  std::span<std::byte> memoryOf(const SharedBuffer& buffer, std::int32_t client, std::uint64_t length);
  /// Unmaps the buffers of a client.
  void forget(std::int32_t client) { buffers_.erase(client); }

 private:
  struct Registered {
    SharedBuffer::Identity identity;
    Mapping mapping;
  };

  std::map<std::int32_t, std::deque<Registered>> buffers_;  // by process, oldest first
};

}  // namespace brivo
