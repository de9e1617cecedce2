// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "process_info.h"
#include "support/temporary_folder.h"

namespace brivo::bench {

/// The path of a program of the build that this one belongs to.
std::string builtProgram(const std::string& name);

/// The brivod of this build as a child process, with settings, database and log of its own. This program and
/// brivoctl are granted the use of cameras. *Thread-bound.*
class ServiceProcess {
 public:
  /// Serves the cards in the folder `volumes`, or in several, with colons between them. Throws when it does
  /// not come up.
  explicit ServiceProcess(const std::string& volumes);
  ~ServiceProcess();
  ServiceProcess(const ServiceProcess&) = delete;
  ServiceProcess& operator=(const ServiceProcess&) = delete;

  std::string managerSocket() const { return home_ / "run/manager"; }
  /// The manager's D-Bus address.
  std::string address() const { return "unix:path=" + managerSocket(); }

  ProcessInfo process() const { return ProcessInfo(pid_); }

  /// Runs the brivoctl of this build as a client of the service; gives its exit code.
  int brivoctl(const std::vector<std::string>& arguments) const;
  /// What the service and brivoctl have printed.
  std::string log() const;

 private:
  pid_t start(const std::string& program, const std::vector<std::string>& arguments) const;
  const test::TemporaryFolder home_;
  const std::string volumes_;
  pid_t pid_ = -1;
};

}  // namespace brivo::bench
