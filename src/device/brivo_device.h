// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "content/camera_device.h"
#include "device/catalogue_counters.h"
#include "device/catalogue_replay.h"
#include "device/clients/client_manager.h"
#include "device/content_enumeration.h"
#include "device/device_notifications.h"
#include "device/device_service.h"
#include "device/device_services.h"
#include "device/object_index.h"
#include "device/object_requests.h"
#include "io/read_memory.h"
#include "platform/base/mutex.h"
#include "platform/base/url.h"
#include "platform/work/lane.h"
#include "platform/work/operation_queue.h"
#include "protocol/result_codes.h"

namespace brivo {

/// One mounted camera volume as it is served to clients: its endpoint, clients, index, property dictionary
/// and the queue on which requests run one at a time. *Thread-safe.* Held by its registry record; its own
/// operations do not own it, so its end cancels and drains the queue, and may wait for a medium.
class BrivoDevice final : public CameraDevice,
                          private OVClientManagerDelegate,
                          private ContentEnumeration::Host {
 public:
  /// A device that clients can reach from now on; null without a URL, and when there is no listener or no
  /// thread to be had. `services` is copied.
  static std::shared_ptr<BrivoDevice> initWithURL(const std::optional<Url>& url,
                                                  const DeviceServices& services);
  ~BrivoDevice() override;

  const Url& url() const { return url_; }
  const Endpoint& endpoint() const { return listener_->endpoint(); }
  /// The device's endpoint, for connections that do not come through it. It takes none any more when the
  /// device has ended, whoever still holds it.
  const std::shared_ptr<zeph::Listener>& listener() const { return listener_; }
  /// The property dictionary as it is now.
  Dictionary cameraDictionary() const BRIVO_EXCLUDES(propertiesLock_);
  void setCameraProperty(std::string_view key, Value value) BRIVO_EXCLUDES(propertiesLock_);
  std::string internalUUID() const;
  /// None until a client has started using the device.
  std::optional<std::string> filesystemPath() const;
  std::vector<std::string> mediaPaths() const BRIVO_EXCLUDES(propertiesLock_);
  /// Always true: the system unmounts volumes, not this service.
  static bool eject() { return true; }

  // Power: one assertion per device, on its operation queue.
  void holdPowerAssertion();
  void releasePowerAssertion();

  // Clients.
  OVClientManager& clientManager() const { return *clientManager_; }
  std::size_t removeClientWithPID(std::int32_t pid) { return clientManager_->removeClientWithPID(pid); }
  std::size_t numberOfClients() const { return clientManager_->currentClientCount(); }
  std::int32_t clientUsingDevice() const { return clientManager_->clientUsingDevice(); }
  void setClientUsingDevice(std::int32_t pid, bool usingDevice) {
    clientManager_->setClientUsingDevice(pid, usingDevice);
  }
  /// Ends every connection.
  void removeAllClients();
  /// What connections export; it ends with the device.
  std::weak_ptr<zeph::ExportedObject> exportedObject();

  // The calls of clients. Replies come once, from the operation queue.
  void requestStartUsingDeviceWithReply(ResultHandler reply);
  void enumerateContentWithOptions(const Dictionary& options,
                                   const std::shared_ptr<zeph::Connection>& connection,
                                   std::function<void()> done);
  void registerInterestedEventNotifications(std::vector<std::string> types, std::int32_t pid,
                                            std::function<void()> done);
  void unregisterInterestedEventNotifications(std::vector<std::string> types, std::int32_t pid,
                                              std::function<void()> done);
  void requestMetadataForObjectHandle(std::uint64_t handle, Dictionary options, ResultHandler reply);
  void requestThumbnailDataForObjectHandle(std::uint64_t handle, Dictionary options, ResultHandler reply);
  void requestDownloadObjectHandle(std::uint64_t handle, Dictionary options, ResultHandler reply);
  void requestReadDataFromObjectHandle(std::uint64_t handle, Dictionary options, std::int32_t client,
                                       ResultHandler reply);
  void requestDeleteObjectHandle(std::uint64_t handle, Dictionary options, ResultHandler reply);

  /// Sends the percentage, then counts the catalogue as complete.
  void updateCatalogingDone();

  // Parts that tests and the service look into.
  ObjectIndex& index() { return index_; }
  CatalogueCounters& counters() { return counters_; }
  DeviceNotifications& notifications() { return notifications_; }
  OperationQueue& deviceOperations() { return *deviceOperations_; }

  // CameraDevice.
  std::string name() const override;
  bool isLocked() const override;
  bool prioritizeSpeed() const override { return enumeration_.prioritizeSpeed(); }
  bool beingEjected() const override { return false; }
  FileSystem& files() const override { return services_.files; }
  void addCameraFileToIndex(const std::shared_ptr<BrivoItem>& item) override {
    index_.addCameraFileToIndex(item);
  }
  void addCameraFolderToIndex(const std::shared_ptr<BrivoItem>& item) override {
    index_.addCameraFolderToIndex(item);
  }
  void flushNotifications(Array datasets) override { notifications_.flushNotifications(std::move(datasets)); }
  std::shared_ptr<BrivoItem> cameraItemWithObjectID(std::uint64_t handle) const override {
    return index_.cameraItemWithObjectID(handle);
  }
  MetadataArchive& metadataArchive() override { return metadataArchive_; }
  ReadMemory& readMemory() override { return readMemory_; }
  ImageDecoder& imageDecoder() const override { return services_.images; }
  MovieService& movies() const override { return services_.movies; }
  std::shared_ptr<SerialQueue> makeSerialQueue() override { return SerialQueue::create(services_.pool); }
  void addInitiatedOperation(Task operation) override;
  void enumerateConcurrently(Task step) override;
  void enumerateWhenClientsKeepUp(Task step) override;

 private:
  BrivoDevice(Url url, const DeviceServices& services);
  bool start();

  /// Queues an operation ahead of the initiated ones.
  void addInteractiveOperation(Task operation);
  /// The same, with the power assertion held around it.
  void addObjectRequest(Task request);
  void startUsing();
  std::optional<std::string> textProperty(std::string_view key) const BRIVO_EXCLUDES(propertiesLock_);
  /// Sends one part of a replay, on the operation queue, and has the next follow when its client has read
  /// enough.
  void sendReplayPart(const std::shared_ptr<CatalogueReplay>& replay);
  /// Runs `task` with this device, on the device's share of the pool, if it is still there then. For tasks
  /// that another thread starts which must never end a device.
  Task onOwnLane(std::function<void(BrivoDevice&)> task);

  // OVClientManagerDelegate.
  void clientWentAway(std::int32_t pid) override;
  void deviceIsServicingZeroClients() override {}  // the device stays until its volume goes
  // ContentEnumeration::Host.
  std::optional<ContentEnumeration::Store> store() const override;
  void replayContents(const std::shared_ptr<zeph::Connection>& connection) override;

  const DeviceServices services_;
  const Url url_;
  const std::shared_ptr<Lane> lane_;

  mutable Mutex propertiesLock_;
  Dictionary cameraDictionary_ BRIVO_GUARDED_BY(propertiesLock_);
  std::vector<std::string> mediaPaths_ BRIVO_GUARDED_BY(propertiesLock_);

  CatalogueCounters counters_;
  MetadataArchive metadataArchive_;
  ReadMemory readMemory_{kLongestRead};
  ObjectIndex index_{counters_};
  const std::shared_ptr<OVClientManager> clientManager_;
  DeviceNotifications notifications_;
  ContentEnumeration enumeration_;
  ObjectRequests requests_{index_, notifications_, readMemory_};
  DeviceService service_{*this, services_};
  std::shared_ptr<zeph::Listener> listener_;
  PowerAssertions::Handle cpPowerAssertion_;  // operation queue

  std::unique_ptr<OperationQueue> deviceOperations_;  // last: operations use everything above
};

}  // namespace brivo
