// SPDX-License-Identifier: MIT
#include "platform/keepalive/launch_service.h"

#include <systemd/sd-daemon.h>

#include <chrono>

namespace brivo {

namespace {

constexpr std::chrono::seconds kPatience{60};
constexpr std::chrono::seconds kPause{20};
constexpr std::chrono::microseconds kLongestAnswer = std::chrono::seconds(5);

}  // namespace

void LaunchService::ready() { sd_notify(0, "READY=1\nSTATUS=Serving"); }

void LaunchService::stopping() {
  stays_.reset();
  if (sd_notify(0, "STOPPING=1\nSTATUS=Ending") > 0) sd_notify_barrier(0, kLongestAnswer.count());
}

void LaunchService::notYet() {
  if (sd_notify(0, "STATUS=Serving somebody who came at the end") <= 0) return;
  stays_ = std::make_shared<bool>(true);
  askForPatience();
}

void LaunchService::askForPatience() {
  sd_notifyf(0, "EXTEND_TIMEOUT_USEC=%lld",
             static_cast<long long>(std::chrono::microseconds(kPatience).count()));
  loop_.postAfter(kPause, [this, weak = std::weak_ptr(stays_)] {
    if (weak.lock()) askForPatience();
  });
}

}  // namespace brivo
