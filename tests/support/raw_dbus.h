// SPDX-License-Identifier: MIT
// A D-Bus peer made of bytes, for what no library would send.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

#include "platform/base/unique_fd.h"

namespace brivo::test {

/// A blocking stream socket connected to the unix socket at `path`; receiving gives up after ten
/// seconds.
UniqueFd connectRaw(const std::string& path);
/// Whether somebody takes connections at the unix socket `path`. Its file is there a moment before.
bool isListening(const std::string& path);

/// The lines that authenticate as this user and negotiate descriptors, "BEGIN" included.
std::string authentication();
/// A method call without arguments, in wire format. `body` may be given with its signature, and with the
/// number of descriptors that will be sent along; a bus needs a destination.
std::string methodCall(std::uint32_t serial, std::string_view interface, std::string_view member,
                       std::string_view signature = "", std::string_view body = "",
                       std::uint32_t descriptors = 0, std::string_view destination = "");
/// `text` as a marshalled D-Bus string.
std::string marshalledString(std::string_view text);

void sendAll(int fd, std::string_view bytes);
/// Sends `count` descriptors along with `bytes`; false when the kernel or the peer's end refuses them.
bool sendWithDescriptors(int fd, std::string bytes, std::size_t count);
/// What arrives until `size` bytes are there, the peer hangs up, or ten seconds have passed.
std::string receive(int fd, std::size_t size);
/// True when the peer hangs up within ten seconds; what it sends before is dropped.
bool hangsUp(int fd);

/// Open descriptors of this process.
std::size_t openDescriptorCount();

}  // namespace brivo::test
