// SPDX-License-Identifier: MIT
#pragma once

#include <systemd/sd-bus.h>

#include "platform/zeph/protocol.h"

namespace brivo::zeph {

/// The members of `protocol` as sd-bus wants them (sd_bus_add_object_vtable(3)), with `onMethod` for every
/// method: what introspection shows and what signatures are checked against. Made once and kept for the life
/// of the program. I/O thread.
const sd_bus_vtable* vtableOf(const Protocol& protocol, sd_bus_message_handler_t onMethod);

}  // namespace brivo::zeph
