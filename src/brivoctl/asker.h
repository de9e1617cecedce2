// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <csignal>
#include <thread>

#include "platform/alerts/desktop_notifications.h"
#include "platform/base/result.h"
#include "platform/work/run_loop.h"

namespace brivoctl {

/// Asks the person at the screen. SIGINT, SIGTERM and SIGHUP end a question and leave nothing on the screen;
/// while this lives they do nothing else. *Thread-bound*, and made before the first thread of the process.
class Asker {
 public:
  /// Why there is no answer: no program shows questions, or a signal came before the answer.
  enum class Failure { nobodyThere, interrupted };

  Asker();
  /// Waits ten seconds at most for a program that has not said yet what it shows. A signal that comes from
  /// now on does what it did before this was made: it ends the process at once.
  ~Asker();
  Asker(const Asker&) = delete;
  Asker& operator=(const Asker&) = delete;

  /// Shows an alert and waits, without limit, for its answer.
  brivo::Result<brivo::UserAlert::Response, Failure> ask(const brivo::Dictionary& alert);

 private:
  sigset_t blockedBefore_{};
  brivo::RunLoop loop_;
  brivo::DesktopNotifications alerts_{loop_};
  std::atomic<bool> interrupted_ = false;
  std::thread thread_;  // runs the loop
};

}  // namespace brivoctl
