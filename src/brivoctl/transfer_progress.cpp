// SPDX-License-Identifier: MIT
#include "brivoctl/transfer_progress.h"

#include <fmt/core.h>

#include <algorithm>
#include <cmath>

#include "brivoctl/command.h"

namespace brivoctl {

namespace {

constexpr std::chrono::milliseconds kJsonPause{500};

}  // namespace

std::string shownDuration(std::chrono::seconds duration) {
  const auto seconds = duration.count();
  if (seconds < 3600) return fmt::format("{}:{:02}", seconds / 60, seconds % 60);
  return fmt::format("{}:{:02}:{:02}", seconds / 3600, seconds / 60 % 60, seconds % 60);
}

TransferProgress::TransferProgress(bool json, std::uint64_t size) : json_(json), size_(size) {}

void TransferProgress::finish() {
  const std::lock_guard lock(mutex_);
  line_.erase();
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
  line_.erase();
  printLine(line);
}

void TransferProgress::print(const Json& line) {
  const std::lock_guard lock(mutex_);
  line_.erase();
  printJsonLine(line);
}

void TransferProgress::complain(const std::string& text) {
  const std::lock_guard lock(mutex_);
  line_.erase();
  fail(text);
}

void TransferProgress::show() {
  if (json_) return showJson();
  if (line_.isDue()) showBar();
}

void TransferProgress::showJson() {
  const auto now = Clock::now();
  if (now - shown_ < kJsonPause) return;
  shown_ = now;
  printJsonLine({{"event", "progress"},
                 {"handle", object_.handle},
                 {"path", object_.path},
                 {"bytes", bytes_},
                 {"size", object_.size}});
}

void TransferProgress::showBar() {
  const std::uint64_t done = std::min(before_ + bytes_, size_);
  const double share = size_ == 0 ? 1 : static_cast<double>(done) / static_cast<double>(size_);
  const double seconds = std::chrono::duration<double>(Clock::now() - start_).count();
  const double rate = done > given_ ? static_cast<double>(done - given_) / seconds : 0;
  const auto left =
      std::chrono::seconds(rate > 0 ? std::llround(static_cast<double>(size_ - done) / rate) : 0);
  line_.show(shown(object_.name), share,
             fmt::format("{:3.0f} %  {}/s  {} left", share * 100, shownSize(static_cast<std::uint64_t>(rate)),
                         rate > 0 ? shownDuration(left) : "?"));
}

}  // namespace brivoctl
