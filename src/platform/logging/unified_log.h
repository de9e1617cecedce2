// SPDX-License-Identifier: MIT
// The system log: the journal when standard error is connected to it, else standard error.
#pragma once

#include <atomic>
#include <string>
#include <string_view>

namespace brivo {

enum class LogLevel { debug, standard, error };

/// Writes finished lines. A line costs one system call, except within a LogBurst; it blocks when the reader
/// of standard error does, except on threads that hold a LogRing. *Thread-safe.*
class UnifiedLog {
 public:
  /// `subsystem` is a reverse-DNS name, `category` the process's name; both travel as journal
  /// fields.
  UnifiedLog(std::string subsystem, std::string category);

  const std::string& subsystem() const { return subsystem_; }
  const std::string& category() const { return category_; }

  /// Drops every line of this process from now on, unless the environment asks for debug lines. For programs
  /// that are not services and speak to their user themselves.
  static void silence();

  /// Debug lines are dropped unless the environment has BRIVOD_DEBUG set to something but "0".
  bool enabled(LogLevel level) const { return debug_ || (level != LogLevel::debug && !silenced); }
  /// Writes `line` with its priority (sd-daemon(3) prefixes on standard error, PRIORITY in the
  /// journal). Control characters in it are shown escaped, so that it stays one line.
  void write(LogLevel level, std::string_view line) const;

 private:
  void writeNow(LogLevel level, std::string_view line) const;
  void writeToJournal(int priority, std::string_view line) const;

  friend class LogRing;

  static std::atomic<bool> silenced;

  const std::string subsystem_;
  const std::string category_;
  const bool debug_;
  const bool journal_;
};

/// The short name of this program, as in /proc/self/comm.
std::string processName();

}  // namespace brivo
