// SPDX-License-Identifier: MIT
#include "brivoctl/transfer_progress.h"

#include <fmt/core.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "brivoctl/command.h"

namespace brivoctl {

namespace {

constexpr std::chrono::milliseconds kBarPause{100};
constexpr std::chrono::milliseconds kJsonPause{500};
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

}  // namespace

std::string shownDuration(std::chrono::seconds duration) {
  const auto seconds = duration.count();
  if (seconds < 3600) return fmt::format("{}:{:02}", seconds / 60, seconds % 60);
  return fmt::format("{}:{:02}:{:02}", seconds / 3600, seconds / 60 % 60, seconds % 60);
}

TransferProgress::TransferProgress(bool json, std::uint64_t size)
    : form_(json                           ? Form::json
            : ::isatty(STDERR_FILENO) == 1 ? Form::bar
                                           : Form::none),
      size_(size) {}

void TransferProgress::finish() {
  const std::lock_guard lock(mutex_);
  erase();
}

void TransferProgress::begin(const orvid::ObjectInfo& object) {
  const std::lock_guard lock(mutex_);
  object_ = object;
  bytes_ = 0;
}

void TransferProgress::reached(std::uint64_t bytes) {
  const std::lock_guard lock(mutex_);
  if (bytes_ == 0) given_ += bytes;
  bytes_ = bytes;
  show();
}

void TransferProgress::end() {
  const std::lock_guard lock(mutex_);
  before_ += object_.size;
  bytes_ = 0;
}

void TransferProgress::print(const std::string& line) {
  const std::lock_guard lock(mutex_);
  erase();
  printLine(line);
}

void TransferProgress::print(const Json& line) {
  const std::lock_guard lock(mutex_);
  erase();
  printJsonLine(line);
}

void TransferProgress::complain(const std::string& text) {
  const std::lock_guard lock(mutex_);
  erase();
  fail(text);
}

void TransferProgress::show() {
  const auto now = Clock::now();
  if (form_ == Form::none || now - shown_ < (form_ == Form::bar ? kBarPause : kJsonPause)) return;
  shown_ = now;
  if (form_ == Form::json) {
    return printJsonLine({{"event", "progress"},
                          {"handle", object_.handle},
                          {"path", object_.path},
                          {"bytes", bytes_},
                          {"size", object_.size}});
  }
  visible_ = true;
  std::fputs(("\r\033[K" + bar(terminalColumns())).c_str(), stderr);
  std::fflush(stderr);
}

void TransferProgress::erase() {
  if (!visible_) return;
  visible_ = false;
  std::fputs("\r\033[K", stderr);
  std::fflush(stderr);
}

std::string TransferProgress::bar(int columns) const {
  const std::uint64_t done = std::min(before_ + bytes_, size_);
  const double share = size_ == 0 ? 1 : static_cast<double>(done) / static_cast<double>(size_);
  const double seconds = std::chrono::duration<double>(Clock::now() - start_).count();
  const double rate = done > given_ ? static_cast<double>(done - given_) / seconds : 0;
  const auto left =
      std::chrono::seconds(rate > 0 ? std::llround(static_cast<double>(size_ - done) / rate) : 0);
  const std::string figures =
      fmt::format(" {:3.0f} %  {}/s  {} left", share * 100, shownSize(static_cast<std::uint64_t>(rate)),
                  rate > 0 ? shownDuration(left) : "?");
  const std::string name = shortened(shown(object_.name), 20);
  const int room = columns - static_cast<int>(name.size() + figures.size()) - 4;
  if (room < 5) return figures.substr(1, static_cast<std::size_t>(std::max(columns - 1, 0)));
  const auto filled = static_cast<std::size_t>(share * room);
  return fmt::format("{} [{}{}]{}", name, std::string(filled, '#'),
                     std::string(static_cast<std::size_t>(room) - filled, ' '), figures);
}

}  // namespace brivoctl
