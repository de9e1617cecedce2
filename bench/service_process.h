// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "support/temporary_folder.h"

namespace brivo::bench {

/// The brivod of this build as a child process, with settings, database and log of its own. This program is
/// granted the use of cameras. *Thread-bound.*
class ServiceProcess {
 public:
  /// Serves the cards in the folder `volumes`. Throws when it does not come up.
  explicit ServiceProcess(const std::string& volumes);
  ~ServiceProcess();
  ServiceProcess(const ServiceProcess&) = delete;
  ServiceProcess& operator=(const ServiceProcess&) = delete;

  std::string managerSocket() const { return home_ / "run/manager"; }
  /// The manager's D-Bus address.
  std::string address() const { return "unix:path=" + managerSocket(); }

  std::size_t threadCount() const;
  /// Memory that is resident now, in KiB.
  double residentKilobytes() const;
  /// The same when it has stopped changing.
  double settledKilobytes() const;

 private:
  pid_t run(const std::string& program, const std::vector<std::string>& arguments) const;

  const test::TemporaryFolder home_;
  const std::string volumes_;
  pid_t pid_ = -1;
};

}  // namespace brivo::bench
