// SPDX-License-Identifier: MIT
#include "platform/logging/unified_log.h"

#include <errno.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <sys/uio.h>
#include <unistd.h>

#define SD_JOURNAL_SUPPRESS_LOCATION
#include <systemd/sd-journal.h>

#include <array>
#include <cstdlib>

#include "platform/logging/log_burst.h"
#include "platform/logging/log_ring.h"
#include "platform/logging/standard_error.h"
#include "platform/text/unicode.h"

namespace brivo {

namespace {

/// Syslog priorities (RFC 5424).
int priorityOf(LogLevel level) {
  switch (level) {
    case LogLevel::debug:
      return 7;
    case LogLevel::standard:
      return 5;
    case LogLevel::error:
      return 3;
  }
  return 5;
}

/// Asked of the journal only when standard error is its stream: without a journal
/// sd_journal_sendv() reports success and the line is lost.
bool standardErrorIsJournal() {
  const char* stream = std::getenv("JOURNAL_STREAM");
  struct stat status {};
  if (!stream || ::fstat(STDERR_FILENO, &status) != 0) return false;
  return fmt::format("{}:{}", status.st_dev, status.st_ino) == stream;
}

bool debugWanted() {
  const char* value = std::getenv("BRIVOD_DEBUG");
  return value && std::string_view(value) != "0" && *value != '\0';
}

}  // namespace

std::atomic<bool> UnifiedLog::silenced = false;

void UnifiedLog::silence() { silenced = true; }

UnifiedLog::UnifiedLog(std::string subsystem, std::string category)
    : subsystem_(std::move(subsystem)),
      category_(std::move(category)),
      debug_(debugWanted()),
      journal_(standardErrorIsJournal()) {}

void UnifiedLog::write(LogLevel level, std::string_view line) const {
  if (!enabled(level)) return;
  const std::string safe = escapingControls(line);
  if (LogRing* ring = LogRing::ofThisThread()) {
    ring->push(*this, level, safe);
  } else {
    writeNow(level, safe);
  }
}

void UnifiedLog::writeNow(LogLevel level, std::string_view line) const {
  const int priority = priorityOf(level);
  if (journal_) return writeToJournal(priority, line);
  const std::string text = fmt::format("<{}>{}\n", priority, line);
  if (LogBurst* burst = LogBurst::ofThisThread()) {
    burst->add(text, level == LogLevel::error);
  } else {
    writeToStandardError(text);
  }
}

void UnifiedLog::writeToJournal(int priority, std::string_view line) const {
  std::array<std::string, 4> fields{fmt::format("MESSAGE={}", line), fmt::format("PRIORITY={}", priority),
                                    "SYSLOG_IDENTIFIER=" + category_, "ORVID_SUBSYSTEM=" + subsystem_};
  std::array<iovec, 4> vectors{};
  for (std::size_t i = 0; i < fields.size(); ++i) vectors[i] = {fields[i].data(), fields[i].size()};
  ::sd_journal_sendv(vectors.data(), static_cast<int>(vectors.size()));
}

std::string processName() { return program_invocation_short_name; }

}  // namespace brivo
