// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <optional>
#include <string>

namespace brivo {

/// What is left to read of an open regular file. None for anything else, for a file that cannot be read, and
/// when there are more than `limit` bytes. Open with O_NONBLOCK, so that a FIFO in its place holds nobody up.
/// *Thread-safe.*
std::optional<std::string> readSmallFile(int fd, std::size_t limit);

}  // namespace brivo
