// SPDX-License-Identifier: MIT
#pragma once

#include "platform/bus/bus_message.h"

namespace brivo::zeph {

/// What has to be kept of `call` to answer it later: a call that stands for it in
/// sd_bus_message_new_method_return(3) and the like, with its sender and its serial. What came with the call
/// goes with the call: its body, and its descriptors, of which a peer can attach more than its signature
/// speaks of. Empty without memory or a connection. I/O thread.
BusMessage receiptFor(sd_bus_message* call);

}  // namespace brivo::zeph
