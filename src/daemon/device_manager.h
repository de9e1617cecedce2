// SPDX-License-Identifier: MIT
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "daemon/remote_camera_device.h"
#include "device/device_services.h"
#include "platform/base/mutex.h"
#include "platform/keepalive/transactions.h"
#include "platform/volumes/domain_monitor.h"
#include "platform/work/run_loop.h"
#include "platform/zeph/listener.h"

namespace brivo {

/// The one manager of the process: it turns mounted volumes into device records, tells connected clients of
/// them, lists them and opens them. *Thread-safe.* No lock is held while it waits for anything.
class MSRemoteCameraDeviceManager final : public zeph::ListenerDelegate,
                                          public zeph::ExportedObject,
                                          public std::enable_shared_from_this<MSRemoteCameraDeviceManager> {
 public:
  /// Every process.
  static constexpr std::int32_t kAllProcesses = -1;

  /// Lists and opens devices on `mainLoop`. All must outlive the manager; `deviceServices` is copied.
  MSRemoteCameraDeviceManager(RunLoop& mainLoop, DomainMonitor& domains, Transactions& transactions,
                              DeviceServices deviceServices);
  /// Ends every connection, then the monitoring, if stop() has not.
  ~MSRemoteCameraDeviceManager() override;

  /// Ends every connection, then the monitoring; the manager does nothing more by itself.
  void stop();

  /// Begins mount monitoring; false when the monitor gave no token, and the registry then stays empty.
  bool startMSDeviceNotifications();

  // What the monitor reports.
  /// Compares the photo-bearing file URLs with those known. Of several that vanish in one change only the
  /// last is processed.
  void domainsChanged(const DomainReport& report) BRIVO_EXCLUDES(domainsLock_);
  /// Removals first, then additions; the keys are mount-point URLs.
  using DomainsByURL = std::map<Url, StorageDomain>;
  void updatedWithAddedMountPoints(const DomainsByURL& added, const DomainsByURL& removed);

  // The registry.
  void notifyClientMSDeviceAdded(const Url& url);
  void notifyClientMSDeviceRemoved(const Url& url);
  /// Null when a record with the same path is there.
  std::shared_ptr<MSRemoteCameraDevice> addRemoteCameraDevice(const Url& url)
      BRIVO_EXCLUDES(remoteCameraDevicesLock_);
  /// True when a record was found and closed.
  bool removeRemoteCameraDevice(const Url& url) BRIVO_EXCLUDES(remoteCameraDevicesLock_);
  /// The first record whose path equals that of `url`; null when there is none.
  std::shared_ptr<MSRemoteCameraDevice> remoteDeviceWithURL(const Url& url) const
      BRIVO_EXCLUDES(remoteCameraDevicesLock_);
  std::shared_ptr<MSRemoteCameraDevice> remoteDeviceForUUID(const std::string& uuid) const
      BRIVO_EXCLUDES(remoteCameraDevicesLock_);
  /// Where clients of an opened device connect; null when there is no such device or it is not open.
  std::shared_ptr<zeph::Listener> listenerOfDevice(const std::string& uuid) const
      BRIVO_EXCLUDES(remoteCameraDevicesLock_);

  // Clients of the manager.
  bool shouldAcceptNewConnection(zeph::Listener& listener,
                                 const std::shared_ptr<zeph::Connection>& connection) override;
  void handle(zeph::Invocation invocation) override;
  void addRemoteManagerConnection(const std::shared_ptr<zeph::Connection>& connection)
      BRIVO_EXCLUDES(remoteManagerConnectionsLock_);
  /// Ends the connections of a process, or of all.
  void removeRemoteManagerConnection(std::int32_t processIdentifier)
      BRIVO_EXCLUDES(remoteManagerConnectionsLock_);
  std::size_t connectionCount() const BRIVO_EXCLUDES(remoteManagerConnectionsLock_);

  // The requests, on the main loop.
  Dictionary deviceList() const BRIVO_EXCLUDES(remoteCameraDevicesLock_);
  /// The properties of a device that is opened for the first time, else its endpoint and UUID; empty when
  /// there is no such device or it cannot be made.
  Dictionary openDevice(const std::string& uuid) BRIVO_EXCLUDES(remoteCameraDevicesLock_);

 private:
  using Records = std::vector<std::shared_ptr<MSRemoteCameraDevice>>;

  /// Tells every client of the manager. Under the devices' lock, so that two changes are told in their order.
  void notifyClients(std::string_view selector, const MSRemoteCameraDevice& record)
      BRIVO_REQUIRES(remoteCameraDevicesLock_);
  Records::const_iterator find(const Url& url) const BRIVO_REQUIRES(remoteCameraDevicesLock_);
  /// Ends the record's device and forgets the record.
  void closeDevice(const std::string& uuid) BRIVO_REQUIRES(remoteCameraDevicesLock_);

  RunLoop& mainLoop_;
  DomainMonitor& domains_;
  Transactions& transactions_;
  const DeviceServices deviceServices_;

  // A transaction per client process keeps the service alive; two connections of one process share it.
  mutable Mutex remoteManagerConnectionsLock_;
  std::vector<std::shared_ptr<zeph::Connection>> remoteManagerConnections_
      BRIVO_GUARDED_BY(remoteManagerConnectionsLock_);
  std::map<std::string, Transactions::Transaction> osTransactions_
      BRIVO_GUARDED_BY(remoteManagerConnectionsLock_);

  mutable Mutex remoteCameraDevicesLock_;
  Records remoteCameraDevices_ BRIVO_GUARDED_BY(remoteCameraDevicesLock_);  // in order of arrival

  Mutex domainsLock_;
  DomainsByURL domainsByURL_ BRIVO_GUARDED_BY(domainsLock_);

  DomainMonitor::Token monitoringContext_;
};

}  // namespace brivo
