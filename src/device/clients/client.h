// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "platform/base/mutex.h"
#include "platform/zeph/connection.h"

namespace brivo {

/// One client process of a device. The interests are *thread-safe*; the session fields are guarded by the
/// registry.
class OVClient {
 public:
  explicit OVClient(std::shared_ptr<zeph::Connection> connection) : connection_(std::move(connection)) {}
  /// Ends the connection.
  ~OVClient();
  OVClient(const OVClient&) = delete;
  OVClient& operator=(const OVClient&) = delete;

  const std::shared_ptr<zeph::Connection>& connection() const { return connection_; }
  /// The peer's process, -1 without a connection.
  std::int32_t pid() const { return connection_ ? connection_->processIdentifier() : -1; }

  /// Duplicates are kept.
  void addNotifications(const std::vector<std::string>& types) BRIVO_EXCLUDES(resourceLock_);
  /// Removes every occurrence.
  void remNotifications(const std::vector<std::string>& types) BRIVO_EXCLUDES(resourceLock_);
  bool interestedInNotification(const std::string& type) const BRIVO_EXCLUDES(resourceLock_);

  bool openSession() const { return openSession_; }
  void setOpenSession(bool value) { openSession_ = value; }
  bool forwardPTPEvents() const { return forwardPTPEvents_; }
  void setForwardPTPEvents(bool value) { forwardPTPEvents_ = value; }
  /// The object that the client is working on, 0 for none.
  std::uint64_t objectHandle() const { return objectHandle_; }
  void setObjectHandle(std::uint64_t value) { objectHandle_ = value; }

 private:
  const std::shared_ptr<zeph::Connection> connection_;
  bool openSession_ = false;
  bool forwardPTPEvents_ = false;
  std::uint64_t objectHandle_ = 0;

  mutable Mutex resourceLock_;
  std::vector<std::string> notifications_ BRIVO_GUARDED_BY(resourceLock_);
};

}  // namespace brivo
