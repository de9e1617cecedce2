// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "device/clients/client.h"
#include "platform/base/mutex.h"
#include "platform/base/value.h"
#include "platform/work/task.h"

namespace brivo {

using Connections = std::vector<std::shared_ptr<zeph::Connection>>;

/// Hears of the clients of a registry. Calls may come on any thread.
class OVClientManagerDelegate {
 public:
  virtual ~OVClientManagerDelegate() = default;
  /// A client has gone; what it left open can be closed.
  virtual void clientWentAway(std::int32_t pid) = 0;
  /// A removal found the registry empty.
  virtual void deviceIsServicingZeroClients() = 0;
};

/// The clients of one device, one per process, in the order of arrival. A client goes when its connection
/// ends. *Thread-safe.* Where two locks are held, the order is clientsLock_, then the client's own.
class OVClientManager : public std::enable_shared_from_this<OVClientManager> {
 public:
  /// Runs a task later, on any thread, and never at once.
  using PerformLater = std::function<void(Task)>;

  explicit OVClientManager(PerformLater performLater) : performLater_(std::move(performLater)) {}

  void setDelegate(std::weak_ptr<OVClientManagerDelegate> delegate) BRIVO_EXCLUDES(clientsLock_);

  /// Registers the connection of a process that has none here yet, and takes over its end handlers.
  void addClientWithConnection(const std::shared_ptr<zeph::Connection>& connection);
  std::vector<std::shared_ptr<OVClient>> copyClientsArray() const BRIVO_EXCLUDES(clientsLock_);
  std::size_t currentClientCount() const BRIVO_EXCLUDES(clientsLock_);
  /// Null when no client has the process identifier.
  std::shared_ptr<OVClient> findClientWithPID(std::int32_t pid) const;
  /// The number of clients that are left. Tells the delegate, later, when there are none.
  std::size_t removeClientWithPID(std::int32_t pid) BRIVO_EXCLUDES(clientsLock_);

  // Interests. Unknown process identifiers are no error, here and below.
  void addNotifications(const std::vector<std::string>& types, std::int32_t pid) BRIVO_EXCLUDES(clientsLock_);
  void remNotifications(const std::vector<std::string>& types, std::int32_t pid) BRIVO_EXCLUDES(clientsLock_);

  // Who should hear, in the order of the registry.
  Connections clientConnectionsMonitoringNotification(const std::string& type) const;
  /// A handle of 2,147,483,648 or more is nobody's: the number is compared as a signed one.
  Connections clientConnectionsMonitoringObjectID(std::uint32_t handle) const BRIVO_EXCLUDES(clientsLock_);
  Connections allClientConnections() const;

  // Session fields.
  /// The first client with an open session, -1 when there is none.
  std::int32_t clientUsingDevice() const BRIVO_EXCLUDES(clientsLock_);
  /// The process identifier 0 is nobody.
  void setClientUsingDevice(std::int32_t pid, bool usingDevice) BRIVO_EXCLUDES(clientsLock_);
  void setClientUsingObjectHandle(std::int32_t pid, std::uint64_t handle) BRIVO_EXCLUDES(clientsLock_);

  /// Messages to single clients are not delivered by this registry: the search is logged, nothing more.
  void sendMessage(const Value& message, std::int32_t pid) const;

 private:
  const PerformLater performLater_;

  mutable Mutex clientsLock_;
  std::weak_ptr<OVClientManagerDelegate> delegate_ BRIVO_GUARDED_BY(clientsLock_);
  std::vector<std::shared_ptr<OVClient>> clients_ BRIVO_GUARDED_BY(clientsLock_);
};

}  // namespace brivo
