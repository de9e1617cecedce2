// SPDX-License-Identifier: MIT
// Measured times and how they are shown.
#pragma once

#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace brivo::bench {

/// Measures from its making on.
class Stopwatch {
 public:
  double milliseconds() const {
    return std::chrono::duration<double, std::milli>(Clock::now() - start_).count();
  }

 private:
  using Clock = std::chrono::steady_clock;
  Clock::time_point start_ = Clock::now();
};

/// How long `work` takes, in milliseconds.
template <class Work>
double millisecondsOf(Work work) {
  const Stopwatch watch;
  work();
  return watch.milliseconds();
}

/// The middle one, or the mean of the two in the middle; 0 of none.
double median(std::vector<double> values);

/// The median of the ratios of what was measured one after the other: of the same index in both.
double medianRatio(const std::vector<double>& values, const std::vector<double>& bases);

/// What a figure should be, whether it is, and the word for it when it is not.
struct Target {
  std::string text;
  bool met;
  const char* missed = "over";
};
Target atMost(double limit, double value);
/// The same with the unit of both.
Target atMost(double limit, double value, const std::string& unit);
Target atLeast(double limit, double value);
Target within(double least, double most, double value);

/// Prints the headings of the columns.
void printHeadings();
/// Prints one line: what was measured, its value, its ratio to the bare loop of the same run, and whether the
/// target is met.
void printFigure(const std::string& what, const std::string& value,
                 std::optional<double> ratio = std::nullopt,
                 const std::optional<Target>& target = std::nullopt);

/// Prints a line of text in the place of a figure.
void printNote(const std::string& text);

/// "12.34 ms".
std::string inMilliseconds(double milliseconds);
/// A number with `unit`, to one digit after the point.
std::string inUnits(double number, const std::string& unit);
/// "20,000".
std::string grouped(std::size_t number);

}  // namespace brivo::bench
