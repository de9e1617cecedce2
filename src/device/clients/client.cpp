// SPDX-License-Identifier: MIT
#include "device/clients/client.h"

#include <algorithm>

namespace brivo {

OVClient::~OVClient() {
  if (connection_) connection_->invalidate();
}

void OVClient::addNotifications(const std::vector<std::string>& types) {
  const MutexLock lock(resourceLock_);
  notifications_.insert(notifications_.end(), types.begin(), types.end());
}

void OVClient::remNotifications(const std::vector<std::string>& types) {
  const MutexLock lock(resourceLock_);
  std::erase_if(notifications_,
                [&](const std::string& one) { return std::ranges::find(types, one) != types.end(); });
}

bool OVClient::interestedInNotification(const std::string& type) const {
  const MutexLock lock(resourceLock_);
  return std::ranges::find(notifications_, type) != notifications_.end();
}

}  // namespace brivo
