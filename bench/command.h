// SPDX-License-Identifier: MIT
// Other programs.
#pragma once

#include <sys/types.h>

#include <string>
#include <vector>

namespace brivo::bench {

/// What a program is started with.
struct Command {
  /// The program, searched for in $PATH when it is a mere name, and its arguments.
  std::vector<std::string> words;
  /// The whole environment, as "NAME=value".
  std::vector<std::string> environment;
  /// Descriptors for what it prints; it reads from what this program reads from.
  int output;
  int error;
};

/// Starts a program, which goes with this one; the caller waits for it. Throws when there is no process.
pid_t start(Command command);
/// Waits until a process has ended. Its exit code: 127 when its program was not found, -1 when a signal ended
/// it.
int exitCodeOf(pid_t process);

/// How a program went.
struct Outcome {
  int exitCode;
  double milliseconds;
  /// The most memory that was resident, at least as much as this program had when it started the other.
  double peakKilobytes;
  std::string errors;  ///< what it printed on standard error
};
/// Runs a program in this one's environment to its end, with its output dropped.
Outcome run(std::vector<std::string> words);
/// The same for a program that must succeed. Throws, with what it says, when it does not.
Outcome runOrThrow(const std::vector<std::string>& words);
/// Whether `program` is there to be run; tried with --version.
bool isInstalled(const std::string& program);

}  // namespace brivo::bench
