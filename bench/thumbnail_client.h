// SPDX-License-Identifier: MIT
// Thumbnails over the wire.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>

#include "platform/base/mapping.h"
#include "wire_client.h"

namespace brivo::bench {

/// A whole request for the thumbnail of an object that is not below `pixels`.
std::string thumbnailRequest(std::uint64_t handle, unsigned pixels);

/// A thumbnail as it came.
class ReceivedThumbnail {
 public:
  /// Asks for it. Throws when there is none.
  ReceivedThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels);

  std::span<const std::byte> bytes() const;
  /// The whole message that it came with.
  const std::string& answer() const { return answer_; }

 private:
  std::string answer_;
  Mapping memory_;  // none when the bytes are in the answer itself
};

/// Asks for one and looks at every page of it; gives milliseconds.
double timeOfThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels);
/// Throws when the longer side of a thumbnail is not `pixels`.
void checkThumbnail(WireClient& client, std::uint64_t handle, unsigned pixels);

}  // namespace brivo::bench
