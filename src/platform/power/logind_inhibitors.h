// SPDX-License-Identifier: MIT
#pragma once

#include <functional>

#include "platform/power/power_assertions.h"
#include "platform/work/run_loop.h"

namespace brivo {

/// Assertions through inhibitor locks of logind (org.freedesktop.login1.Manager.Inhibit, "sleep:idle",
/// "block"). A lock that is no longer needed lingers for a while and is used again by the next assertion of
/// its name, so that a run of short assertions costs one call. Without logind it does nothing, after saying
/// so once.
class LogindInhibitors final : public PowerAssertions {
 public:
  static constexpr std::chrono::seconds kLinger{5};

  /// Works on `loop`, which must outlive every handle. `onUnavailable` hears one line, on the loop, when
  /// there is no logind.
  LogindInhibitors(RunLoop& loop, std::function<void(const std::string&)> onUnavailable,
                   std::chrono::milliseconds linger = kLinger);
  /// Loop thread, or when the loop does not run any more.
  ~LogindInhibitors() override;

  Handle create(const std::string& name, std::chrono::seconds timeout) override;

 private:
  class Locks;
  const std::shared_ptr<Locks> locks_;
};

}  // namespace brivo
