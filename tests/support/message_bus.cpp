// SPDX-License-Identifier: MIT
#include "support/message_bus.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <stdexcept>

#include "platform/base/unique_fd.h"

namespace brivo::test {

namespace {

/// The configuration of a session bus, but for where it finds programs to start.
std::string configurationIn(const TemporaryFolder& folder) {
  constexpr const char* kPolicy = R"(
    <policy context="default">
      <allow send_destination="*" eavesdrop="true"/>
      <allow eavesdrop="true"/>
      <allow own="*"/>
    </policy>)";
  return "<busconfig><type>session</type><listen>unix:path=" + (folder / "bus") + "</listen><servicedir>" +
         (folder / "services") + "</servicedir>" + kPolicy + "</busconfig>";
}

}  // namespace

MessageBus::MessageBus() {
  makeFolder(folder_ / "services");
  writeFile(folder_ / "configuration", configurationIn(folder_));
  const std::string configuration = "--config-file=" + (folder_ / "configuration");
  int ends[2];
  if (::pipe2(ends, O_CLOEXEC) != 0) throw std::runtime_error("pipe2");
  const UniqueFd readEnd(ends[0]);
  UniqueFd writeEnd(ends[1]);
  pid_ = ::fork();
  if (pid_ == 0) {
    ::dup2(writeEnd.get(), 3);
    ::execlp("dbus-daemon", "dbus-daemon", configuration.c_str(), "--nofork", "--print-address=3", nullptr);
    ::_exit(127);
  }
  writeEnd.reset();
  char byte = 0;
  while (::read(readEnd.get(), &byte, 1) == 1 && byte != '\n') address_ += byte;
  if (address_.empty()) throw std::runtime_error("dbus-daemon does not start");
}

MessageBus::~MessageBus() { end(); }

void MessageBus::addService(const std::string& name, const std::string& command) {
  writeFile(folder_ / "services/" + name + ".service",
            "[D-BUS Service]\nName=" + name + "\nExec=" + command + "\n");
}

void MessageBus::end() {
  if (pid_ < 0) return;
  ::kill(pid_, SIGTERM);
  ::waitpid(pid_, nullptr, 0);
  pid_ = -1;
}

}  // namespace brivo::test
