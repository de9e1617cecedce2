// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace brivo::bench {

/// Whoever else does the same work.
struct Rival {
  std::string what;
  /// Does the work; gives milliseconds.
  std::function<double()> time;
  /// The target for the ratio of our time to this one.
  double mostRatio;
};

/// Measures `ours` and the rivals in so many turns, after one that does not count. Prints our time, and for
/// each rival its time and the ratio of ours to it.
void printComparison(const std::string& what, const std::function<double()>& ours,
                     const std::vector<Rival>& rivals, int turns);

/// Whether a rival's program can be run; a note when not.
bool canCompareWith(const std::string& program);

}  // namespace brivo::bench
