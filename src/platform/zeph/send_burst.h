// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <memory>
#include <vector>

namespace brivo::zeph {

class BusConnection;

/// While one lives, what its thread sends wakes the I/O thread at most once in a millisecond, and once when
/// it goes: a wake-up costs more than a small message. For work that sends very many signals; what other
/// threads send is not held up. Not nested. *Thread-bound* to its maker.
class SendBurst {
 public:
  SendBurst();
  ~SendBurst();
  SendBurst(const SendBurst&) = delete;
  SendBurst& operator=(const SendBurst&) = delete;

  /// The burst of the calling thread, or null.
  static SendBurst* ofThisThread();

  /// True when this wakes the I/O thread for what waits on `connection`; false when the caller should do it
  /// now.
  bool takesOver(const std::shared_ptr<BusConnection>& connection);

 private:
  using Clock = std::chrono::steady_clock;

  Clock::time_point lastWaking_;
  std::vector<std::shared_ptr<BusConnection>> waiting_;
};

}  // namespace brivo::zeph
