// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <memory>

#include "platform/alerts/user_alerts.h"
#include "platform/work/run_loop.h"

namespace brivo {

class AlertBoard;

/// Alerts as notifications of the desktop, with a button for each action: what org.freedesktop.Notifications
/// on the session bus shows (Desktop Notifications Specification 1.2). They have no time-out and are
/// critical, because many servers take away others after some seconds.
///
/// Only a button is an answer. A click beside the buttons is none: servers that close a notification on it
/// dismiss the alert, as does everything else that takes it from the screen, by whoever's hand. When the
/// server goes, an alert is shown again by the next one, which the bus may start; when the bus goes, all are
/// dismissed.
class DesktopNotifications final : public UserAlerts {
 public:
  /// Starting a server may take a while.
  static constexpr std::chrono::seconds kPatience{25};

  /// Works on `loop`, which must run in another thread than those that show alerts and must outlive every
  /// alert. A server that has not shown an alert within `patience` counts as none.
  explicit DesktopNotifications(RunLoop& loop, std::chrono::milliseconds patience = kPatience);
  /// Dismisses every alert, so that nobody waits any more; waits ten seconds at most for a server that is
  /// just being asked to show one. Loop thread, or when the loop does not run any more.
  ~DesktopNotifications() override;

  /// Null when there is no session bus, no server, one that shows no buttons, or one that refuses. Waits for
  /// that.
  std::unique_ptr<UserAlert> show(const Dictionary& alert) override;

  /// Takes all alerts from the screen; who waits for one hears that it was dismissed. Loop thread.
  void dismissAll();

 private:
  RunLoop& loop_;
  const std::chrono::milliseconds patience_;
  const std::shared_ptr<AlertBoard> board_;
};

}  // namespace brivo
