// SPDX-License-Identifier: MIT
#include "platform/zeph/call_receipt.h"

#include <cstdint>

#include "platform/zeph/protocol.h"

namespace brivo::zeph {

BusMessage receiptFor(sd_bus_message* call) {
  BusMessage receipt;
  std::uint64_t serial = 0;
  const char* sender = sd_bus_message_get_sender(call);
  int result = sd_bus_message_get_cookie(call, &serial);
  if (result >= 0) {
    result = sd_bus_message_new_method_call(sd_bus_message_get_bus(call), receipt.out(), nullptr, kObjectPath,
                                            nullptr, sd_bus_message_get_member(call));
  }
  if (result >= 0 && sender) result = sd_bus_message_set_sender(receipt.get(), sender);
  if (result >= 0) {
    result = sd_bus_message_set_expect_reply(receipt.get(), sd_bus_message_get_expect_reply(call));
  }
  if (result >= 0) result = sd_bus_message_seal(receipt.get(), serial, 0);
  return result < 0 ? BusMessage() : std::move(receipt);
}

}  // namespace brivo::zeph
