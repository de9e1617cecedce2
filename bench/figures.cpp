// SPDX-License-Identifier: MIT
#include "figures.h"

#include <algorithm>
#include <array>
#include <cstdio>

namespace brivo::bench {

namespace {

std::string formatted(const char* format, double number) {
  std::array<char, 48> buffer{};
  std::snprintf(buffer.data(), buffer.size(), format, number);
  return buffer.data();
}

void printLine(const char* what, const char* value, const char* ratio, const char* target, const char* met) {
  std::printf("%-58s %12s %8s  %-14s %s\n", what, value, ratio, target, met);
  std::fflush(stdout);
}

}  // namespace

double median(std::vector<double> values) {
  if (values.empty()) return 0;
  std::ranges::sort(values);
  const std::size_t middle = values.size() / 2;
  return values.size() % 2 == 1 ? values[middle] : (values[middle - 1] + values[middle]) / 2;
}

double medianRatio(const std::vector<double>& values, const std::vector<double>& bases) {
  std::vector<double> ratios;
  for (std::size_t i = 0; i < values.size(); ++i) ratios.push_back(values[i] / bases[i]);
  return median(std::move(ratios));
}

Target atMost(double limit, double value) { return {formatted("<= %.2f", limit), value <= limit}; }

Target atMost(double limit, double value, const std::string& unit) {
  return {"<= " + inUnits(limit, unit), value <= limit};
}

Target atLeast(double limit, double value) { return {formatted(">= %.2f", limit), value >= limit, "under"}; }

Target within(double least, double most, double value) {
  const char* missed = value < least ? "under" : "over";
  return {formatted("%.2f to ", least) + formatted("%.2f", most), least <= value && value <= most, missed};
}

void printHeadings() { printLine("figure", "value", "ratio", "target", ""); }

void printFigure(const std::string& what, const std::string& value, std::optional<double> ratio,
                 const std::optional<Target>& target) {
  printLine(what.c_str(), value.c_str(), ratio ? formatted("%.2f", *ratio).c_str() : "-",
            target ? target->text.c_str() : "-", target ? (target->met ? "ok" : target->missed) : "");
}

void printNote(const std::string& text) { std::printf("%s\n", text.c_str()); }

std::string inMilliseconds(double milliseconds) { return formatted("%.2f ms", milliseconds); }

std::string inUnits(double number, const std::string& unit) { return formatted("%.1f ", number) + unit; }

std::string grouped(std::size_t number) {
  std::string text = std::to_string(number);
  for (std::size_t i = text.size(); i > 3; i -= 3) text.insert(i - 3, 1, ',');
  return text;
}

}  // namespace brivo::bench
