// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>

namespace brivo::test {

/// A message bus of one's own (dbus-daemon), which ends with this.
class MessageBus {
 public:
  MessageBus();
  ~MessageBus();
  MessageBus(const MessageBus&) = delete;
  MessageBus& operator=(const MessageBus&) = delete;

  const std::string& address() const { return address_; }
  /// Ends it before its time.
  void end();

 private:
  pid_t pid_ = -1;
  std::string address_;
};

}  // namespace brivo::test
