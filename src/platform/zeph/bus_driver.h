// SPDX-License-Identifier: MIT
#pragma once

struct sd_bus;

namespace brivo::zeph {

/// The unique name that the service's end of every connection goes by.
inline constexpr const char* kServiceName = ":1.0";

/// Serves just enough of org.freedesktop.DBus on `bus` for tools that expect a message bus at the
/// other end (D-Bus Specification, "Message Bus Messages"). Negative errno on failure. I/O thread.
int addBusDriver(sd_bus* bus);

}  // namespace brivo::zeph
