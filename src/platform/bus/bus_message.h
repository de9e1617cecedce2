// SPDX-License-Identifier: MIT
#pragma once

#include <systemd/sd-bus.h>

#include <utility>

namespace brivo {

/// Owns one reference to a message of sd-bus. *Thread-bound* to the thread of its bus.
class BusMessage {
 public:
  BusMessage() = default;
  /// Takes a reference of its own.
  explicit BusMessage(sd_bus_message* message) : message_(sd_bus_message_ref(message)) {}
  BusMessage(BusMessage&& other) noexcept : message_(std::exchange(other.message_, nullptr)) {}
  BusMessage& operator=(BusMessage&& other) noexcept {
    std::swap(message_, other.message_);
    return *this;
  }
  ~BusMessage() { sd_bus_message_unref(message_); }

  sd_bus_message* get() const { return message_; }
  /// Where a function of sd-bus puts a message that it makes.
  sd_bus_message** out() { return &message_; }

 private:
  sd_bus_message* message_ = nullptr;
};

}  // namespace brivo
