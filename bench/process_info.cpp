// SPDX-License-Identifier: MIT
#include "process_info.h"

#include <cmath>
#include <filesystem>
#include <fstream>
#include <numeric>
#include <stdexcept>
#include <thread>

#include "support/processes.h"

namespace brivo::bench {

namespace fs = std::filesystem;

namespace {

constexpr std::chrono::milliseconds kLookInterval{100};
constexpr int kMostLooks = 50;
constexpr double kUnchangedKilobytes = 64;

double sumOf(const std::vector<ProcessInfo>& processes, double (ProcessInfo::*kilobytes)() const) {
  return std::accumulate(processes.begin(), processes.end(), 0.0,
                         [&](double sum, const ProcessInfo& each) { return sum + (each.*kilobytes)(); });
}

}  // namespace

std::size_t ProcessInfo::threadCount() const {
  const fs::directory_iterator tasks(pathOf("task"));
  return static_cast<std::size_t>(std::distance(fs::begin(tasks), fs::end(tasks)));
}

std::vector<ProcessInfo> ProcessInfo::children() const {
  std::vector<ProcessInfo> children;
  for (const pid_t child : test::childrenOf(process_)) {
    if (test::isRunning(child)) children.emplace_back(child);
  }
  return children;
}

double ProcessInfo::residentKilobytes() const { return numberIn("status", "VmRSS:"); }
double ProcessInfo::peakKilobytes() const { return numberIn("status", "VmHWM:"); }
double ProcessInfo::bytesRead() const { return numberIn("io", "rchar:"); }

double ProcessInfo::numberIn(const std::string& file, const std::string& word) const {
  std::ifstream words(pathOf(file));
  for (std::string other; words >> other;) {
    double number = 0;
    if (other == word && words >> number) return number;
  }
  throw std::runtime_error("a process that is measured has ended");
}

std::string ProcessInfo::pathOf(const std::string& file) const {
  return "/proc/" + std::to_string(process_) + "/" + file;
}

void ProcessInfo::resetPeak() const {
  constexpr const char* kPeakOfResidentMemory = "5";  // proc_pid_clear_refs(5)
  std::ofstream(pathOf("clear_refs")) << kPeakOfResidentMemory;
}

double ProcessInfo::settledKilobytes() const {
  double last = residentKilobytes();
  for (int i = 0; i < kMostLooks; ++i) {
    std::this_thread::sleep_for(kLookInterval);
    const double now = residentKilobytes();
    if (std::abs(now - last) < kUnchangedKilobytes) return now;
    last = now;
  }
  return last;
}

double peakAboveRest(const std::vector<ProcessInfo>& processes, const std::function<void()>& work) {
  const double atRest = sumOf(processes, &ProcessInfo::settledKilobytes);
  for (const ProcessInfo& process : processes) process.resetPeak();
  work();
  return (sumOf(processes, &ProcessInfo::peakKilobytes) - atRest) / 1024;
}

}  // namespace brivo::bench
