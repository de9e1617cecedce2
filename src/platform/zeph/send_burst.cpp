// SPDX-License-Identifier: MIT
#include "platform/zeph/send_burst.h"

#include <algorithm>

#include "platform/zeph/bus_connection.h"

namespace brivo::zeph {

namespace {

constexpr std::chrono::milliseconds kLongestWait{1};

thread_local SendBurst* burst = nullptr;

}  // namespace

SendBurst::SendBurst() { burst = this; }

SendBurst::~SendBurst() {
  burst = nullptr;
  for (const auto& connection : waiting_) connection->wake();
}

SendBurst* SendBurst::ofThisThread() { return burst; }

bool SendBurst::takesOver(const std::shared_ptr<BusConnection>& connection) {
  const auto now = Clock::now();
  if (now - lastWaking_ > kLongestWait) {
    lastWaking_ = now;
    return false;
  }
  if (std::ranges::find(waiting_, connection) == waiting_.end()) waiting_.push_back(connection);
  return true;
}

}  // namespace brivo::zeph
