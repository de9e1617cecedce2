// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "platform/work/run_loop.h"

namespace brivo {

/// What the launch service that started the process (systemd) is told about it, as sd_notify(3) says; nothing
/// when there is none. *Thread-bound* to the loop.
class LaunchService {
 public:
  /// `loop` must outlive this.
  explicit LaunchService(RunLoop& loop) : loop_(loop) {}

  /// The process can be reached.
  static void ready();
  /// The process ends, and whoever wants it from here on is to get the next one. Blocks until
  /// the launch service knows, for 5 seconds at most.
  void stopping();
  /// After stopping(): the process has to stay for somebody who came just before. Until the next stopping()
  /// the launch service is asked for patience, because there is no way back from what it was told.
  void notYet();

 private:
  void askForPatience();

  RunLoop& loop_;
  std::shared_ptr<bool> stays_;  // while the process stays after all
};

}  // namespace brivo
