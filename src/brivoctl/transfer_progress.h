// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <cstdint>
#include <mutex>
#include <string>

#include "brivoctl/output.h"
#include "brivoctl/progress_line.h"
#include "orvidcore/orvidcore.h"

namespace brivoctl {

/// How far a transfer of files is: a bar with rate and time left on standard error when that is a terminal,
/// JSON lines on standard output on request, nothing otherwise. *Thread-safe.*
class TransferProgress {
 public:
  /// `size` is the sum of all files, in bytes.
  TransferProgress(bool json, std::uint64_t size);
  TransferProgress(const TransferProgress&) = delete;
  TransferProgress& operator=(const TransferProgress&) = delete;

  /// The next file.
  void begin(const orvid::ObjectInfo& object);
  /// `bytes` of the current file are there; the first call may count some that were there before.
  void reached(std::uint64_t bytes);
  /// The current file is over, whole or not.
  void end();
  /// All files are: takes the bar away.
  void finish();

  /// A line of the program's own, on standard output or standard error, which the bar makes room for.
  void print(const std::string& line);
  void print(const Json& line);
  void complain(const std::string& text);

 private:
  using Clock = std::chrono::steady_clock;

  void show();
  void showJson();
  void showBar();

  const bool json_;
  const std::uint64_t size_;
  const Clock::time_point start_ = Clock::now();

  std::mutex mutex_;
  ProgressLine line_;
  orvid::ObjectInfo object_;
  std::uint64_t before_ = 0;  // bytes of the files that are over
  std::uint64_t given_ = 0;   // bytes that say nothing of the rate
  std::uint64_t bytes_ = 0;   // of the current file
  Clock::time_point shown_ = start_;
};

/// Such as "1:05:09", hours only when there are any.
std::string shownDuration(std::chrono::seconds duration);

}  // namespace brivoctl
