// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>

#include "support/temporary_folder.h"

namespace brivo::test {

/// A message bus of one's own (dbus-daemon), which ends with this. It starts no program of this machine.
class MessageBus {
 public:
  MessageBus();
  ~MessageBus();
  MessageBus(const MessageBus&) = delete;
  MessageBus& operator=(const MessageBus&) = delete;

  const std::string& address() const { return address_; }
  /// From now on it starts `command` when somebody calls `name` and nobody has that.
  void addService(const std::string& name, const std::string& command);
  /// Ends it before its time.
  void end();

 private:
  const TemporaryFolder folder_;
  pid_t pid_ = -1;
  std::string address_;
};

}  // namespace brivo::test
