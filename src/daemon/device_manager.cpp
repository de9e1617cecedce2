// SPDX-License-Identifier: MIT
#include "daemon/device_manager.h"

#include <fmt/format.h>

#include <algorithm>

#include "platform/base/paths.h"
#include "protocol/keys.h"
#include "protocol/protocols.h"
#include "protocol/selectors.h"
#include "util/log.h"

namespace brivo {

namespace {

const zeph::Interface& exportedInterface() {
  static const zeph::Interface interface = restrictedInterface(
      deviceManagerProtocol(),
      {{selectors::kRequestDeviceList, 1}, {selectors::kOpenDevice, 1}, {selectors::kCloseDevice, 1}});
  return interface;
}

const zeph::Interface& remoteObjectInterface() {
  static const zeph::Interface interface = restrictedInterface(
      deviceManagerProtocol(), {{selectors::kNotifyAddedDevice, 0}, {selectors::kNotifyRemovedDevice, 0}});
  return interface;
}

std::string transactionKey(std::int32_t processIdentifier) { return fmt::format("{:05}", processIdentifier); }

}  // namespace

MSRemoteCameraDeviceManager::MSRemoteCameraDeviceManager(RunLoop& mainLoop, DomainMonitor& domains,
                                                         Transactions& transactions,
                                                         DeviceServices deviceServices)
    : mainLoop_(mainLoop),
      domains_(domains),
      transactions_(transactions),
      deviceServices_(std::move(deviceServices)) {}

MSRemoteCameraDeviceManager::~MSRemoteCameraDeviceManager() { stop(); }

void MSRemoteCameraDeviceManager::stop() {
  removeRemoteManagerConnection(kAllProcesses);
  if (monitoringContext_) domains_.endMonitoring(monitoringContext_);
  monitoringContext_.reset();
}

// ---------------------------------------------------------------------------------------- mount monitoring

bool MSRemoteCameraDeviceManager::startMSDeviceNotifications() {
  OVLog("live files", "begin monitoring live-files");
  // Not owned by the handler: the manager ends the monitoring before it goes.
  monitoringContext_ =
      domains_.beginMonitoring([this](const DomainReport& report) { domainsChanged(report); });
  return monitoringContext_ != nullptr;
}

void MSRemoteCameraDeviceManager::domainsChanged(const DomainReport& report) {
  if (!report.ok()) return OVLogError("live files", "monitoring error: {}\n", report.error().text());
  DomainsByURL current;
  for (const auto& [identifier, domain] : *report) {
    OVLog(domain.containsPhotos ? "yes" : "nope", "{}", identifier);
    if (!domain.containsPhotos) continue;
    for (const Url& url : domain.storageURLs) {
      if (url.isFile()) current.insert_or_assign(url, domain);
    }
  }
  DomainsByURL added;
  DomainsByURL removed;
  {
    const MutexLock lock(domainsLock_);
    for (const auto& entry : domainsByURL_) {
      if (!current.contains(entry.first)) removed = {entry};  // each takes the place of the one before
    }
    for (const auto& entry : current) {
      if (!domainsByURL_.contains(entry.first)) added.insert(entry);
    }
    domainsByURL_ = std::move(current);
  }
  updatedWithAddedMountPoints(added, removed);
}

void MSRemoteCameraDeviceManager::updatedWithAddedMountPoints(const DomainsByURL& added,
                                                              const DomainsByURL& removed) {
  for (const auto& [url, domain] : removed) {
    OVLog("MS Media", "Removed: {}", lastPathComponent(url.path()));
    notifyClientMSDeviceRemoved(url);
  }
  for (const auto& [url, domain] : added) {
    OVLog("MS Media", "Added: {}", lastPathComponent(url.path()));
    notifyClientMSDeviceAdded(url);
  }
}

// ------------------------------------------------------------------------------------------------ registry

void MSRemoteCameraDeviceManager::notifyClientMSDeviceAdded(const Url& url) {
  const auto record = addRemoteCameraDevice(url);
  if (!record) return;
  const MutexLock lock(remoteCameraDevicesLock_);
  notifyClients(selectors::kNotifyAddedDevice, *record);
}

void MSRemoteCameraDeviceManager::notifyClientMSDeviceRemoved(const Url& url) {
  const auto record = remoteDeviceWithURL(url);
  if (!record) return;
  {
    const MutexLock lock(remoteCameraDevicesLock_);
    notifyClients(selectors::kNotifyRemovedDevice, *record);
  }
  removeRemoteCameraDevice(url);
}

void MSRemoteCameraDeviceManager::notifyClients(std::string_view selector,
                                                const MSRemoteCameraDevice& record) {
  std::vector<std::shared_ptr<zeph::Connection>> connections;
  {
    const MutexLock lock(remoteManagerConnectionsLock_);
    connections = remoteManagerConnections_;
  }
  const auto arguments = std::make_shared<const zeph::Arguments>(zeph::Arguments{record.deviceContext()});
  for (const auto& connection : connections) {
    const auto report = [pid = connection->processIdentifier()](const zeph::CallError& error) {
      OVLogError("remoteManager", "[{:05}] {}", pid, error.text);
    };
    connection->remoteObjectProxyWithErrorHandler(report).send(selector, arguments);
  }
}

std::shared_ptr<MSRemoteCameraDevice> MSRemoteCameraDeviceManager::addRemoteCameraDevice(const Url& url) {
  const MutexLock lock(remoteCameraDevicesLock_);
  if (find(url) != remoteCameraDevices_.end()) return nullptr;
  return remoteCameraDevices_.emplace_back(std::make_shared<MSRemoteCameraDevice>(url));
}

bool MSRemoteCameraDeviceManager::removeRemoteCameraDevice(const Url& url) {
  const MutexLock lock(remoteCameraDevicesLock_);
  const auto record = find(url);
  if (record == remoteCameraDevices_.end()) return false;
  OVLog("msremotedevicemanager", "close device");
  closeDevice((*record)->uuidString());
  return true;
}

void MSRemoteCameraDeviceManager::closeDevice(const std::string& uuid) {
  const auto found = std::ranges::find(remoteCameraDevices_, uuid, &MSRemoteCameraDevice::uuidString);
  if (found == remoteCameraDevices_.end()) return;
  OVLog("msremotedevicemanager", "close: {}", uuid);
  if (auto camera = (*found)->takeCamera()) {
    camera->removeAllClients();
    // A device may wait for its medium before it ends: not here.
    deviceServices_.pool.post([camera = std::move(camera)]() mutable { camera.reset(); });
  }
  remoteCameraDevices_.erase(found);
}

MSRemoteCameraDeviceManager::Records::const_iterator MSRemoteCameraDeviceManager::find(const Url& url) const {
  return std::ranges::find_if(
      remoteCameraDevices_, [path = url.path()](const auto& record) { return record->url().path() == path; });
}

std::shared_ptr<MSRemoteCameraDevice> MSRemoteCameraDeviceManager::remoteDeviceWithURL(const Url& url) const {
  const MutexLock lock(remoteCameraDevicesLock_);
  const auto record = find(url);
  return record == remoteCameraDevices_.end() ? nullptr : *record;
}

std::shared_ptr<MSRemoteCameraDevice> MSRemoteCameraDeviceManager::remoteDeviceForUUID(
    const std::string& uuid) const {
  const MutexLock lock(remoteCameraDevicesLock_);
  const auto record = std::ranges::find(remoteCameraDevices_, uuid, &MSRemoteCameraDevice::uuidString);
  return record == remoteCameraDevices_.end() ? nullptr : *record;
}

std::shared_ptr<zeph::Listener> MSRemoteCameraDeviceManager::listenerOfDevice(const std::string& uuid) const {
  const MutexLock lock(remoteCameraDevicesLock_);
  const auto record = std::ranges::find(remoteCameraDevices_, uuid, &MSRemoteCameraDevice::uuidString);
  if (record == remoteCameraDevices_.end() || !(*record)->camera()) return nullptr;
  return (*record)->camera()->listener();
}

// ------------------------------------------------------------------------------------------------- clients

bool MSRemoteCameraDeviceManager::shouldAcceptNewConnection(
    zeph::Listener&, const std::shared_ptr<zeph::Connection>& connection) {
  OVLog("remoteManager", "New Connection: {}", connection->processIdentifier());
  connection->setExportedInterface(exportedInterface());
  connection->setRemoteObjectInterface(remoteObjectInterface());
  connection->setExportedObject(weak_from_this());
  addRemoteManagerConnection(connection);
  connection->resume();
  return true;
}

void MSRemoteCameraDeviceManager::addRemoteManagerConnection(
    const std::shared_ptr<zeph::Connection>& connection) {
  const std::int32_t pid = connection->processIdentifier();
  const auto remaining = std::make_shared<std::atomic_flag>();  // clear while the handler has not acted
  const Task ended = [weak = weak_from_this(), pid, remaining] {
    const auto self = weak.lock();
    if (self && !remaining->test_and_set()) self->removeRemoteManagerConnection(pid);
  };
  connection->setInvalidationHandler(ended);
  connection->setInterruptionHandler(ended);
  const MutexLock lock(remoteManagerConnectionsLock_);
  const std::string key = transactionKey(pid);
  osTransactions_[key] = transactions_.begin(key);
  remoteManagerConnections_.push_back(connection);
}

void MSRemoteCameraDeviceManager::removeRemoteManagerConnection(std::int32_t processIdentifier) {
  const MutexLock lock(remoteManagerConnectionsLock_);
  const auto connections = remoteManagerConnections_;
  for (const auto& connection : connections) {
    const std::int32_t pid = connection->processIdentifier();
    if (processIdentifier != kAllProcesses && processIdentifier != pid) continue;
    osTransactions_.erase(transactionKey(pid));
    OVLog("-transactions", "[{:05}]", osTransactions_.size());
    connection->setInvalidationHandler(nullptr);  // so that the end does not call back
    connection->setInterruptionHandler(nullptr);
    connection->invalidate();
    std::erase(remoteManagerConnections_, connection);
  }
}

std::size_t MSRemoteCameraDeviceManager::connectionCount() const {
  const MutexLock lock(remoteManagerConnectionsLock_);
  return remoteManagerConnections_.size();
}

void MSRemoteCameraDeviceManager::handle(zeph::Invocation invocation) {
  mainLoop_.post([weak = weak_from_this(), call = std::move(invocation)] {
    const auto self = weak.lock();
    if (!self) return;
    if (call.selector == selectors::kRequestDeviceList) {
      OVLog("getDeviceList", "requestDeviceListWithReply");
      call.reply({self->deviceList()});
    } else if (call.selector == selectors::kOpenDevice) {
      call.reply({self->openDevice(*call.arguments[0].get<std::string>())});
    }
  });
}

Dictionary MSRemoteCameraDeviceManager::deviceList() const {
  Array contexts;
  {
    const MutexLock lock(remoteCameraDevicesLock_);
    for (const auto& record : remoteCameraDevices_) contexts.append(record->deviceContext());
  }
  Dictionary list;
  list.set(keys::kDeviceContexts, std::move(contexts));
  return list;
}

Dictionary MSRemoteCameraDeviceManager::openDevice(const std::string& uuid) {
  // The whole of it under the lock, so that a volume that goes meanwhile finds its device in the record.
  const MutexLock lock(remoteCameraDevicesLock_);
  const auto found = std::ranges::find(remoteCameraDevices_, uuid, &MSRemoteCameraDevice::uuidString);
  const auto record = found == remoteCameraDevices_.end() ? nullptr : *found;
  if (record && record->camera()) {
    Dictionary reply;
    reply.set(keys::kInternalDeviceUUID, record->uuidString());
    reply.set(keys::kDeviceEndpoint, record->camera()->endpoint());
    return reply;
  }
  // Without a record there is no URL, and of no URL no device is made.
  const auto device =
      BrivoDevice::initWithURL(record ? std::optional<Url>(record->url()) : std::nullopt, deviceServices_);
  OVLog("BrivoDevice", "new device");
  if (!device) return {};
  device->setCameraProperty(keys::kDeviceEndpoint, device->endpoint());
  device->setCameraProperty(keys::kInternalDeviceUUID, record->uuidString());
  record->setCamera(device);
  return device->cameraDictionary();
}

}  // namespace brivo
