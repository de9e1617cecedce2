// SPDX-License-Identifier: MIT
#include "support/message_bus.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

#include "platform/base/unique_fd.h"

namespace brivo::test {

MessageBus::MessageBus() {
  int ends[2];
  if (::pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("pipe2");
  const UniqueFd readEnd(ends[0]);
  UniqueFd writeEnd(ends[1]);
  pid_ = ::fork();
  if (pid_ == 0) {
    ::dup2(writeEnd.get(), 3);
    ::execlp("dbus-daemon", "dbus-daemon", "--session", "--nofork", "--print-address=3", nullptr);
    ::_exit(127);
  }
  writeEnd.reset();
  char byte = 0;
  while (::read(readEnd.get(), &byte, 1) == 1 && byte != '\n') address_ += byte;
  if (address_.empty()) throw std::runtime_error("dbus-daemon does not start");
}

MessageBus::~MessageBus() { end(); }

void MessageBus::end() {
  if (pid_ < 0) return;
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
  pid_ = -1;
}

}  // namespace brivo::test
