// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

#include "support/temporary_folder.h"

namespace brivo::bench {

/// The brivod of this build as a child process, with settings, database and log of its own. This program and
/// brivoctl are granted the use of cameras. *Thread-bound.*
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
  /// The most memory that has been resident since the last resetPeak(), in KiB; since the start of the
  /// service where the kernel resets nothing.
  double peakKilobytes() const;
  void resetPeak() const;

  /// Bytes that its read calls have got since its start, from files and from everything else.
  double bytesRead() const;

  /// Runs the brivoctl of this build as a client of the service; gives its exit code.
  int brivoctl(const std::vector<std::string>& arguments) const;
  /// What the service and brivoctl have printed.
  std::string log() const;

 private:
  pid_t start(const std::string& program, const std::vector<std::string>& arguments) const;
  /// A number in one of the process's files in /proc, by the word before it.
  double numberIn(const std::string& file, const std::string& word) const;

  const test::TemporaryFolder home_;
  const std::string volumes_;
  pid_t pid_ = -1;
};

}  // namespace brivo::bench
