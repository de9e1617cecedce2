// SPDX-License-Identifier: MIT
// Bytes that travel through a unix stream socket together with descriptors (unix(7), SCM_RIGHTS).
#pragma once

#include <cstddef>
#include <deque>
#include <span>
#include <string_view>

#include "platform/base/unique_fd.h"

namespace brivo::bench {

/// Sends `bytes` and a second descriptor of what `descriptor` stands for. Throws when they do not go out
/// whole.
void sendWithDescriptor(int socket, std::string_view bytes, int descriptor);
/// Receives what is there, and at least something, into `buffer`, and appends the descriptors that came
/// along, in their order. Bytes received; 0 when the peer hung up, less on failure.
std::ptrdiff_t receiveWithDescriptors(int socket, std::span<char> buffer, std::deque<UniqueFd>& descriptors);

}  // namespace brivo::bench
