// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <condition_variable>

#include "platform/alerts/user_alerts.h"
#include "platform/base/mutex.h"

namespace brivo {

/// What has become of one alert. It begins as asked for; then it is refused or shown, and once shown it is
/// answered. What comes out of that order has no effect. *Thread-safe.*
class AlertAnswer {
 public:
  /// A server has it on the screen.
  void setShown() BRIVO_EXCLUDES(mutex_);
  /// Only the first answer counts.
  void answer(UserAlert::Response response) BRIVO_EXCLUDES(mutex_);
  /// Nobody will answer any more: refused when it was never shown, else dismissed.
  void giveUp() BRIVO_EXCLUDES(mutex_);

  /// Shown, answered or not.
  bool wasShown() const BRIVO_EXCLUDES(mutex_);
  /// Nothing can change any more.
  bool isOver() const BRIVO_EXCLUDES(mutex_);

  /// False when it is refused, or neither shown nor refused within `limit`.
  bool waitUntilShown(std::chrono::milliseconds limit) const BRIVO_EXCLUDES(mutex_);
  /// Of an alert that was shown.
  UserAlert::Response waitForAnswer() const BRIVO_EXCLUDES(mutex_);

 private:
  enum class Phase { asked, refused, shown, answered };

  void move(Phase from, Phase to) BRIVO_EXCLUDES(mutex_);
  bool has(Phase one, Phase other) const BRIVO_EXCLUDES(mutex_);

  mutable Mutex mutex_;
  mutable std::condition_variable_any changed_;
  Phase phase_ BRIVO_GUARDED_BY(mutex_) = Phase::asked;
  UserAlert::Response response_ BRIVO_GUARDED_BY(mutex_) = UserAlert::dismissed;
};

}  // namespace brivo
