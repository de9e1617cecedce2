// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <string>

namespace brivoctl {

/// A bar on standard error that says how far something is, when that is a terminal; nothing otherwise.
/// *Thread-bound.*
class ProgressLine {
 public:
  ProgressLine();
  ~ProgressLine() { erase(); }
  ProgressLine(const ProgressLine&) = delete;
  ProgressLine& operator=(const ProgressLine&) = delete;

  /// False while there is no terminal, and for a moment after each show().
  bool isDue() const;
  /// Replaces what is shown: the end of `name`, which must be safe for a terminal, a bar that is full at a
  /// `share` of 1, and `figures`.
  void show(const std::string& name, double share, const std::string& figures);
  /// Makes room for other lines.
  void erase();

 private:
  using Clock = std::chrono::steady_clock;

  const bool hasTerminal_;
  Clock::time_point shown_ = Clock::now();
  bool visible_ = false;
};

}  // namespace brivoctl
