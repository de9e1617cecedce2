// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <string>
#include <string_view>

namespace brivo {

/// While one lives, ordinary lines that its thread writes to standard error are written together: at the
/// latest with the first line after ten milliseconds, with an error line, and when it goes. For work that
/// logs very many lines. Not nested. *Thread-bound* to its maker.
class LogBurst {
 public:
  LogBurst();
  ~LogBurst();
  LogBurst(const LogBurst&) = delete;
  LogBurst& operator=(const LogBurst&) = delete;

  /// The burst of the calling thread, or null.
  static LogBurst* ofThisThread();

  /// Adds a line with its end, and writes everything when that is due or `now`.
  void add(std::string_view line, bool now);

 private:
  void write();

  std::chrono::steady_clock::time_point lastWriting_;
  std::string lines_;
};

}  // namespace brivo
