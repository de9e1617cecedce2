// SPDX-License-Identifier: MIT
#pragma once

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

namespace brivo::bench {

/// What /proc tells of a process. Every function throws when the process has ended.
class ProcessInfo {
 public:
  explicit ProcessInfo(pid_t process) : process_(process) {}

  std::size_t threadCount() const;
  /// Its children that have not ended.
  std::vector<ProcessInfo> children() const;

  /// Memory that is resident now, in KiB.
  double residentKilobytes() const;
  /// The same when it has stopped changing.
  double settledKilobytes() const;
  /// The most memory that has been resident since the last resetPeak(), in KiB; since the start of the
  /// process where the kernel resets nothing.
  double peakKilobytes() const;
  void resetPeak() const;

  /// Bytes that its read calls have got since its start, from files and from everything else.
  double bytesRead() const;

 private:
  /// A number in one of the files, by the word before it.
  double numberIn(const std::string& file, const std::string& word) const;

  std::string pathOf(const std::string& file) const;

  pid_t process_;
};

/// How far the peaks of these processes together rise above their rest while `work` runs, in MiB.
double peakAboveRest(const std::vector<ProcessInfo>& processes, const std::function<void()>& work);

}  // namespace brivo::bench
