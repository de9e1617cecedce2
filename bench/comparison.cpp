// SPDX-License-Identifier: MIT
#include "comparison.h"

#include "command.h"
#include "figures.h"

namespace brivo::bench {

namespace {

std::string shownTime(double milliseconds) {
  return milliseconds < 1 ? inUnits(milliseconds * 1000, "us") : inMilliseconds(milliseconds);
}

void printRival(const Rival& rival, const std::vector<double>& times, const std::vector<double>& ours) {
  const double ratio = medianRatio(ours, times);
  printFigure("  to " + rival.what, shownTime(median(times)), ratio, atMost(rival.mostRatio, ratio));
}

}  // namespace

void printComparison(const std::string& what, const std::function<double()>& ours,
                     const std::vector<Rival>& rivals, int turns) {
  std::vector<double> ofOurs;
  std::vector<std::vector<double>> ofRivals(rivals.size());
  for (int turn = 0; turn <= turns; ++turn) {
    const bool counts = turn > 0;
    const double time = ours();
    if (counts) ofOurs.push_back(time);
    for (std::size_t i = 0; i < rivals.size(); ++i) {
      const double rivalTime = rivals[i].time();
      if (counts) ofRivals[i].push_back(rivalTime);
    }
  }
  printFigure(what, shownTime(median(ofOurs)));
  for (std::size_t i = 0; i < rivals.size(); ++i) printRival(rivals[i], ofRivals[i], ofOurs);
}

bool canCompareWith(const std::string& program) {
  if (isInstalled(program)) return true;
  printNote("no comparison with " + program + ", which is not installed");
  return false;
}

}  // namespace brivo::bench
