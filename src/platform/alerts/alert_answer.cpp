// SPDX-License-Identifier: MIT
#include "platform/alerts/alert_answer.h"

namespace brivo {

void AlertAnswer::move(Phase from, Phase to) {
  const MutexLock lock(mutex_);
  if (phase_ != from) return;
  phase_ = to;
  changed_.notify_all();
}

void AlertAnswer::setShown() { move(Phase::asked, Phase::shown); }

void AlertAnswer::answer(UserAlert::Response response) {
  const MutexLock lock(mutex_);
  if (phase_ != Phase::shown) return;
  phase_ = Phase::answered;
  response_ = response;
  changed_.notify_all();
}

void AlertAnswer::giveUp() {
  move(Phase::asked, Phase::refused);
  answer(UserAlert::dismissed);
}

bool AlertAnswer::has(Phase one, Phase other) const {
  const MutexLock lock(mutex_);
  return phase_ == one || phase_ == other;
}

bool AlertAnswer::wasShown() const { return has(Phase::shown, Phase::answered); }

bool AlertAnswer::isOver() const { return has(Phase::refused, Phase::answered); }

bool AlertAnswer::waitUntilShown(std::chrono::milliseconds limit) const {
  const auto deadline = std::chrono::steady_clock::now() + limit;
  const MutexLock lock(mutex_);
  while (phase_ == Phase::asked) {
    if (changed_.wait_until(mutex_, deadline) == std::cv_status::timeout) break;
  }
  return phase_ == Phase::shown || phase_ == Phase::answered;
}

UserAlert::Response AlertAnswer::waitForAnswer() const {
  const MutexLock lock(mutex_);
  while (phase_ == Phase::shown) changed_.wait(mutex_);
  return response_;
}

}  // namespace brivo
