// SPDX-License-Identifier: MIT
#include "util/clocks.h"

#include <fmt/format.h>

#include <atomic>
#include <ctime>

namespace brivo {

namespace {

/// CLOCK_MONOTONIC counts nanoseconds.
constexpr std::uint64_t kTimebaseNumerator = 1;
constexpr std::uint64_t kTimebaseDenominator = 1;

std::atomic<float> benchmarkStart = 0;
std::atomic<float> benchmarkResult = 0;

std::int64_t monotonicTicks() {
  timespec now{};
  ::clock_gettime(CLOCK_MONOTONIC, &now);
  return std::int64_t{now.tv_sec} * 1'000'000'000 + now.tv_nsec;
}

}  // namespace

std::string __OVLogDateString() {
  timespec now{};
  ::clock_gettime(CLOCK_REALTIME, &now);
  tm local{};
  ::localtime_r(&now.tv_sec, &local);
  // "%06.3ld" of the C library: at least 3 digits, padded with blanks to 6.
  const std::string nanoseconds = fmt::format("{:03}", now.tv_nsec);
  return fmt::format("{:02}:{:02}:{:02}:{:>6}  ", local.tm_hour, local.tm_min, local.tm_sec, nanoseconds);
}

double OVConvertTimebaseToMilliseconds(std::int64_t ticks) {
  if (kTimebaseDenominator == 0) return 0.0;
  const std::uint64_t nanoseconds =
      static_cast<std::uint64_t>(ticks) * kTimebaseNumerator / kTimebaseDenominator;
  return static_cast<double>(nanoseconds) / 1'000'000.0;
}

void startBenchmark() {
  benchmarkStart.store(static_cast<float>(monotonicTicks()), std::memory_order_relaxed);
}

float stopBenchmark() {
  const float elapsed = static_cast<float>(monotonicTicks()) - benchmarkStart.load(std::memory_order_relaxed);
  const float milliseconds = elapsed / 1'000'000.0F;
  benchmarkResult.store(milliseconds, std::memory_order_relaxed);
  return milliseconds;
}

float lastBenchmarkResult() { return benchmarkResult.load(std::memory_order_relaxed); }

std::string benchmarkLine(std::string_view label, float milliseconds) {
  return fmt::format("{}   [{:5.0f} ms] {}", label, milliseconds, milliseconds > 300 ? "{⊗}" : "{𝚫}");
}

}  // namespace brivo
