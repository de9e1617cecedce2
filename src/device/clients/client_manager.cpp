// SPDX-License-Identifier: MIT
#include "device/clients/client_manager.h"

#include <algorithm>

#include "util/log.h"

namespace brivo {

namespace {

std::string listed(const std::vector<std::string>& types) {
  Array array(Array::Kind::strings);
  for (const std::string& type : types) array.append(type);
  return describe(array);
}

template <class Filter>
Connections connectionsOf(const std::vector<std::shared_ptr<OVClient>>& clients, Filter filter) {
  Connections connections;
  for (const auto& client : clients) {
    if (filter(*client)) connections.push_back(client->connection());
  }
  return connections;
}

}  // namespace

void OVClientManager::setDelegate(std::weak_ptr<OVClientManagerDelegate> delegate) {
  const MutexLock lock(clientsLock_);
  delegate_ = std::move(delegate);
}

void OVClientManager::addClientWithConnection(const std::shared_ptr<zeph::Connection>& connection) {
  const std::int32_t pid = connection ? connection->processIdentifier() : -1;
  if (!connection || findClientWithPID(pid)) {
    OVLog("CM", "[{:05}] Client already exists?", pid);
  } else {
    const Task terminated = [weak = weak_from_this(), pid] {
      OVLog("CM", "[{}] Terminated ZEPH connection!", pid);
      if (const auto self = weak.lock()) self->removeClientWithPID(pid);
    };
    connection->setInterruptionHandler(terminated);
    connection->setInvalidationHandler(terminated);
    {
      const MutexLock lock(clientsLock_);
      clients_.push_back(std::make_shared<OVClient>(connection));
    }
    OVLog("CM", "[{:05}] Added Client", pid);
  }
  OVLog("CM", "[{:05}] Client count", currentClientCount());
}

std::vector<std::shared_ptr<OVClient>> OVClientManager::copyClientsArray() const {
  const MutexLock lock(clientsLock_);
  return clients_;
}

std::size_t OVClientManager::currentClientCount() const {
  const MutexLock lock(clientsLock_);
  return clients_.size();
}

std::shared_ptr<OVClient> OVClientManager::findClientWithPID(std::int32_t pid) const {
  const auto clients = copyClientsArray();
  const auto found = std::ranges::find(clients, pid, &OVClient::pid);
  return found == clients.end() ? nullptr : *found;
}

std::size_t OVClientManager::removeClientWithPID(std::int32_t pid) {
  OVLog("client manager", "[{:05}] Removing Client", static_cast<std::uint64_t>(pid));
  const auto client = findClientWithPID(pid);  // ends, with its connection, after the lock
  std::size_t count = 0;
  std::weak_ptr<OVClientManagerDelegate> delegate;
  {
    const MutexLock lock(clientsLock_);
    std::erase(clients_, client);
    count = clients_.size();
    delegate = delegate_;
  }
  performLater_([delegate, pid, found = client != nullptr, isEmpty = count == 0] {
    const auto listener = delegate.lock();
    if (listener && found) listener->clientWentAway(pid);
    if (listener && isEmpty) listener->deviceIsServicingZeroClients();
  });
  return count;
}

void OVClientManager::addNotifications(const std::vector<std::string>& types, std::int32_t pid) {
  const auto client = findClientWithPID(pid);
  const MutexLock lock(clientsLock_);
  OVLog("adding", "[{:05}] - {}", pid, listed(types));
  if (client) client->addNotifications(types);
}

void OVClientManager::remNotifications(const std::vector<std::string>& types, std::int32_t pid) {
  const auto client = findClientWithPID(pid);
  const MutexLock lock(clientsLock_);
  OVLog("removing", "[{:05}] - {}", pid, listed(types));
  if (client) client->remNotifications(types);
}

Connections OVClientManager::clientConnectionsMonitoringNotification(const std::string& type) const {
  const auto clients = copyClientsArray();
  OVLogVerbose(kLogTypeDetail, "noteInterest", "[{:05}] - {}", clients.size(), type);
  return connectionsOf(clients,
                       [&](const OVClient& client) { return client.interestedInNotification(type); });
}

Connections OVClientManager::clientConnectionsMonitoringObjectID(std::uint32_t handle) const {
  const auto clients = copyClientsArray();
  OVLogVerbose(kLogTypeDetail, "noteInterest", "[{:05}] - 0x{:08X}", clients.size(), handle);
  const auto wanted = static_cast<std::uint64_t>(std::int64_t{static_cast<std::int32_t>(handle)});
  const MutexLock lock(clientsLock_);
  return connectionsOf(clients, [&](const OVClient& client) { return client.objectHandle() == wanted; });
}

Connections OVClientManager::allClientConnections() const {
  const auto clients = copyClientsArray();
  OVLogVerbose(kLogTypeDetail, "noteInterest", "[{:05}] - {}", clients.size(), "All Clients");
  return connectionsOf(clients, [](const OVClient&) { return true; });
}

std::int32_t OVClientManager::clientUsingDevice() const {
  const MutexLock lock(clientsLock_);
  const auto found = std::ranges::find_if(clients_, [](const auto& client) { return client->openSession(); });
  return found == clients_.end() ? -1 : (*found)->pid();
}

void OVClientManager::setClientUsingDevice(std::int32_t pid, bool usingDevice) {
  const auto client = pid == 0 ? nullptr : findClientWithPID(pid);
  const MutexLock lock(clientsLock_);
  if (client) client->setOpenSession(usingDevice);
}

void OVClientManager::setClientUsingObjectHandle(std::int32_t pid, std::uint64_t handle) {
  const auto client = findClientWithPID(pid);
  const MutexLock lock(clientsLock_);
  if (client) client->setObjectHandle(handle);
}

void OVClientManager::sendMessage(const Value&, std::int32_t pid) const {
  OVLog("searchingClients", "[{:05}]", pid);
}

}  // namespace brivo
