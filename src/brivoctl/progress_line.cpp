// SPDX-License-Identifier: MIT
#include "brivoctl/progress_line.h"

#include <fmt/core.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>

namespace brivoctl {

namespace {

constexpr std::chrono::milliseconds kPause{100};
constexpr int kUsualColumns = 80;

int terminalColumns() {
  winsize size{};
  return ::ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : kUsualColumns;
}

/// The end of a long name, which is what tells names apart. Whole UTF-8 characters.
std::string shortened(const std::string& name, std::size_t most) {
  if (name.size() <= most) return name;
  std::size_t from = name.size() - most;
  while (from < name.size() && (static_cast<unsigned char>(name[from]) & 0xC0) == 0x80) ++from;
  return name.substr(from);
}

std::string lineOf(const std::string& name, double share, const std::string& figures, int columns) {
  const int room = columns - static_cast<int>(name.size() + figures.size()) - 5;
  if (room < 5) return figures.substr(0, static_cast<std::size_t>(std::max(columns - 1, 0)));
  const auto filled = static_cast<std::size_t>(share * room);
  return fmt::format("{} [{}{}] {}", name, std::string(filled, '#'),
                     std::string(static_cast<std::size_t>(room) - filled, ' '), figures);
}

}  // namespace

ProgressLine::ProgressLine() : hasTerminal_(::isatty(STDERR_FILENO) == 1) {}

bool ProgressLine::isDue() const { return hasTerminal_ && Clock::now() - shown_ >= kPause; }

void ProgressLine::show(const std::string& name, double share, const std::string& figures) {
  if (!hasTerminal_) return;
  shown_ = Clock::now();
  visible_ = true;
  std::fputs(("\r\033[K" + lineOf(shortened(name, 20), share, figures, terminalColumns())).c_str(), stderr);
  std::fflush(stderr);
}

void ProgressLine::erase() {
  if (!visible_) return;
  visible_ = false;
  std::fputs("\r\033[K", stderr);
  std::fflush(stderr);
}

}  // namespace brivoctl
