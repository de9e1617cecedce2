// SPDX-License-Identifier: MIT
// D-Bus server addresses of unix sockets (D-Bus Specification, "Server Addresses"). Pure and
// *thread-safe*.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/base/value.h"

namespace brivo::zeph {

/// "unix:path=..." with the bytes that an address may not hold escaped.
Endpoint endpointForPath(std::string_view path);

/// The path of the first unix:path entry of the address; none when it has none or is malformed.
std::optional<std::string> pathOfEndpoint(const Endpoint& endpoint);

}  // namespace brivo::zeph
