// SPDX-License-Identifier: MIT
// Times for log lines.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace brivo {

/// The local time of day as hour:minute:second:nanosecond and two blanks; the nanoseconds are the
/// raw count, zero-padded to at least 3 digits in a field of 6. *Thread-safe.*
std::string __OVLogDateString();

/// Ticks of the machine's monotonic clock to milliseconds; a tick is a nanosecond here.
/// *Thread-safe.*
double OVConvertTimebaseToMilliseconds(std::int64_t ticks);

/// The process-wide stopwatch of benchmark lines. Concurrent users overwrite each other's start;
/// the figures only feed log lines. *Thread-safe.*
void startBenchmark();
/// Milliseconds since the last startBenchmark() of any thread, in single precision; kept as the
/// last result.
float stopBenchmark();
/// What stopBenchmark() last gave.
float lastBenchmarkResult();

/// "label   [  ms ms] marker", where the marker says whether `milliseconds` exceeded 300.
std::string benchmarkLine(std::string_view label, float milliseconds);

}  // namespace brivo
