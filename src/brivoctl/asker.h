// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <thread>

#include "platform/alerts/desktop_notifications.h"
#include "platform/base/result.h"
#include "platform/work/run_loop.h"

namespace brivoctl {

/// Asks the person at the screen. SIGINT, SIGTERM and SIGHUP end a question and leave nothing on the screen;
/// while this lives they do nothing else. *Thread-bound*, and made before the first thread of the process.
class Asker {
 public:
  enum class Failure { nobodyThere, interrupted };

  Asker();
  ~Asker();
  Asker(const Asker&) = delete;
  Asker& operator=(const Asker&) = delete;

  /// Shows an alert and waits, without limit, for its answer.
  brivo::Result<brivo::UserAlert::Response, Failure> ask(const brivo::Dictionary& alert);

 private:
  brivo::RunLoop loop_;
  brivo::DesktopNotifications alerts_{loop_};
  std::atomic<bool> interrupted_ = false;
  std::thread thread_;  // runs the loop
};

}  // namespace brivoctl
