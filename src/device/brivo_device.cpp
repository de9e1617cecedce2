// SPDX-License-Identifier: MIT
#include "device/brivo_device.h"

#include <algorithm>
#include <system_error>

#include "content/volume_qualification.h"
#include "device/catalogue_replay.h"
#include "platform/base/paths.h"
#include "platform/base/uuid.h"
#include "platform/logging/log_burst.h"
#include "platform/text/unicode.h"
#include "platform/zeph/send_burst.h"
#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "util/log.h"

namespace brivo {

namespace {

/// Walks of one card that run at a time: with more, a card that does not answer would hold more threads.
constexpr std::size_t kWalksAtOnce = 4;
constexpr std::chrono::seconds kPowerAssertionTimeout{120};
constexpr std::uint64_t kMountedReadOnly = 1;

using Priority = OperationQueue::Priority;

/// A step of a walk sends and logs very much.
Task inBurst(Task step) {
  return [step = std::move(step)] {
    const zeph::SendBurst signals;
    const LogBurst lines;
    step();
  };
}

}  // namespace

BrivoDevice::BrivoDevice(Url url, const DeviceServices& services)
    : services_(services),
      url_(std::move(url)),
      lane_(Lane::create(services_.pool, std::min(kWalksAtOnce, Pool::defaultThreadCount()))),
      clientManager_(std::make_shared<OVClientManager>(
          [&pool = services_.pool](Task task) { pool.post(std::move(task)); })),
      notifications_(*clientManager_, counters_, [this] { return internalUUID(); }),
      enumeration_(*this, *this, index_, counters_, notifications_) {}

std::shared_ptr<BrivoDevice> BrivoDevice::initWithURL(const std::optional<Url>& url,
                                                      const DeviceServices& services) {
  if (!url) return nullptr;
  std::shared_ptr<BrivoDevice> device(new BrivoDevice(*url, services));
  return device->start() ? device : nullptr;
}

bool BrivoDevice::start() {
  try {
    deviceOperations_ = std::make_unique<OperationQueue>("OVDeviceOperationQueue");
  } catch (const std::system_error& error) {
    OVLogError("brivodevice", "{}", error.what());
    return false;
  }
  listener_ = services_.makeListener();
  if (!listener_) return false;
  const auto self = std::static_pointer_cast<BrivoDevice>(shared_from_this());
  clientManager_->setDelegate(std::shared_ptr<OVClientManagerDelegate>(self, this));
  listener_->setDelegate(std::shared_ptr<zeph::ListenerDelegate>(self, &service_));
  listener_->resume();
  return true;
}

BrivoDevice::~BrivoDevice() {
  if (!listener_) return;
  OVLog("brivodevice", "{:>16} - {}", "dealloc path", lastPathComponent(url_.path()));
  deviceOperations_->cancelAllOperations();
  deviceOperations_->waitUntilAllOperationsAreFinished();
  requests_.closeAllStreams();
  listener_->invalidate();
}

// ---------------------------------------------------------------------------------------------- properties

Dictionary BrivoDevice::cameraDictionary() const {
  const MutexLock lock(propertiesLock_);
  return cameraDictionary_;
}

void BrivoDevice::setCameraProperty(std::string_view key, Value value) {
  const MutexLock lock(propertiesLock_);
  cameraDictionary_.set(key, std::move(value));
}

std::vector<std::string> BrivoDevice::mediaPaths() const {
  const MutexLock lock(propertiesLock_);
  return mediaPaths_;
}

std::optional<std::string> BrivoDevice::textProperty(std::string_view key) const {
  const MutexLock lock(propertiesLock_);
  const std::string* text = cameraDictionary_.string(key);
  return text ? std::optional(*text) : std::nullopt;
}

std::string BrivoDevice::internalUUID() const {
  return textProperty(keys::kInternalDeviceUUID).value_or(std::string());
}

std::string BrivoDevice::name() const { return textProperty(keys::kDeviceName).value_or(std::string()); }

std::optional<std::string> BrivoDevice::filesystemPath() const {
  return textProperty(keys::kDeviceVolumePath);
}

bool BrivoDevice::isLocked() const {
  const MutexLock lock(propertiesLock_);
  return cameraDictionary_.boolean(keys::kDeviceLocked).value_or(false);
}

std::optional<ContentEnumeration::Store> BrivoDevice::store() const {
  if (!cameraDictionary().contains(keys::kDeviceStarted)) return std::nullopt;
  return ContentEnumeration::Store{name(), url_.path(), mediaPaths()};
}

void BrivoDevice::startUsing() {
  if (cameraDictionary().contains(keys::kDeviceStarted)) return;
  const std::string path = url_.path();
  counters_.resetPreflightCount();
  std::vector<std::string> found;
  if (IsSupportedMassStorageCameraVolume(path, &found, services_.deviceMatchingInfo(), services_.files)) {
    OVLog("session", "BrivoDevice Properties: {}", describe(cameraDictionary()));
  } else {
    found = {"DCIM"};
    OVLogError("⚠️⚠️⚠️⚠️", "Failed -- force continuing: {}", path);
  }
  const VolumeStatistics statistics = services_.volumeStatistics(path);
  OVLog("fsInfo", "f_flags: {}, f_fstypename: {}, f_mntonname: {}, f_mntfromname: {}\n", statistics.flags,
        statistics.typeName, statistics.mountedOn, statistics.mountedFrom);
  const MutexLock lock(propertiesLock_);
  mediaPaths_.insert(mediaPaths_.end(), found.begin(), found.end());
  cameraDictionary_.set(keys::kDeviceName, replacingInvalidUtf8(lastPathComponent(path)));
  cameraDictionary_.set(keys::kDeviceEjectable, true);
  cameraDictionary_.set(keys::kDeviceLocked, static_cast<std::int32_t>(statistics.flags & kMountedReadOnly));
  cameraDictionary_.set(keys::kDeviceUUIDString, randomUuidString());
  cameraDictionary_.set(keys::kDeviceAllowsSyncingClock, false);
  cameraDictionary_.set(keys::kDeviceTransportType, "OVTransportTypeMassStorage");
  cameraDictionary_.set(keys::kDeviceProductType, "Camera");
  cameraDictionary_.set(keys::kDeviceVolumePath, replacingInvalidUtf8(path));
  cameraDictionary_.set(keys::kDeviceStarted, true);
}

void BrivoDevice::holdPowerAssertion() {
  if (cpPowerAssertion_) return;
  cpPowerAssertion_ = services_.power.create("org.orvid.brivod-zeph+" + name(), kPowerAssertionTimeout);
}

void BrivoDevice::releasePowerAssertion() { cpPowerAssertion_.reset(); }

// ------------------------------------------------------------------------------------------------- clients

std::weak_ptr<zeph::ExportedObject> BrivoDevice::exportedObject() {
  return std::shared_ptr<zeph::ExportedObject>(shared_from_this(), &service_);
}

void BrivoDevice::removeAllClients() {
  for (const auto& connection : clientManager_->allClientConnections()) connection->invalidate();
}

void BrivoDevice::clientWentAway(std::int32_t pid) {
  addInteractiveOperation([this, pid] { requests_.forgetClient(pid); });
}

void BrivoDevice::requestStartUsingDeviceWithReply(ResultHandler reply) {
  addInteractiveOperation([this, reply = std::move(reply)] {
    startUsing();
    reply(cameraDictionary());
  });
}

void BrivoDevice::enumerateContentWithOptions(const Dictionary& options,
                                              const std::shared_ptr<zeph::Connection>& connection,
                                              std::function<void()> done) {
  enumeration_.enumerateContentWithOptions(options, connection, std::move(done));
}

void BrivoDevice::registerInterestedEventNotifications(std::vector<std::string> types, std::int32_t pid,
                                                       std::function<void()> done) {
  addInteractiveOperation([this, types = std::move(types), pid, done = std::move(done)] {
    clientManager_->addNotifications(types, pid);
    done();
  });
}

void BrivoDevice::unregisterInterestedEventNotifications(std::vector<std::string> types, std::int32_t pid,
                                                         std::function<void()> done) {
  addInteractiveOperation([this, types = std::move(types), pid, done = std::move(done)] {
    clientManager_->remNotifications(types, pid);
    done();
  });
}

void BrivoDevice::requestMetadataForObjectHandle(std::uint64_t handle, Dictionary options,
                                                 ResultHandler reply) {
  addObjectRequest([this, handle, options = std::move(options), reply = std::move(reply)] {
    requests_.requestMetadataForObjectHandle(handle, options, reply);
  });
}

void BrivoDevice::requestThumbnailDataForObjectHandle(std::uint64_t handle, Dictionary options,
                                                      ResultHandler reply) {
  addObjectRequest([this, handle, options = std::move(options), reply = std::move(reply)] {
    const LogBurst lines;  // most requests of a client, and each logs several
    requests_.requestThumbnailDataForObjectHandle(handle, options, reply);
  });
}

void BrivoDevice::requestDownloadObjectHandle(std::uint64_t, Dictionary options, ResultHandler reply) {
  addInteractiveOperation([options = std::move(options), reply = std::move(reply)] {
    ObjectRequests::requestDownloadObjectHandle(options, reply);
  });
}

void BrivoDevice::requestReadDataFromObjectHandle(std::uint64_t handle, Dictionary options,
                                                  std::int32_t client, ResultHandler reply) {
  addObjectRequest([this, handle, options = std::move(options), client, reply = std::move(reply)] {
    requests_.requestReadDataFromObjectHandle(handle, options, client, reply);
  });
}

void BrivoDevice::requestDeleteObjectHandle(std::uint64_t handle, Dictionary options, ResultHandler reply) {
  addObjectRequest([this, handle, options = std::move(options), reply = std::move(reply)] {
    requests_.requestDeleteObjectHandle(handle, options, reply);
  });
}

void BrivoDevice::updateCatalogingDone() {
  notifications_.sendNotificationContentCatalogPercentCompleted();  // the computed value, not 100
  counters_.setCatalogingDone(true);
}

// -------------------------------------------------------------------------------------------------- queues

void BrivoDevice::addInteractiveOperation(Task operation) {
  deviceOperations_->addOperation(std::move(operation), Priority::high);
}

void BrivoDevice::addInitiatedOperation(Task operation) {
  deviceOperations_->addOperation(std::move(operation), Priority::normal);
}

void BrivoDevice::addObjectRequest(Task request) {
  addInteractiveOperation([this, request = std::move(request)] {
    holdPowerAssertion();
    request();
    releasePowerAssertion();
  });
}

Task BrivoDevice::onOwnLane(std::function<void(BrivoDevice&)> task) {
  return [lane = lane_, weak = weak_from_this(), task = std::move(task)] {
    lane->post([weak, task] {
      if (const auto self = weak.lock()) task(static_cast<BrivoDevice&>(*self));
    });
  };
}

void BrivoDevice::enumerateConcurrently(Task step) { lane_->post(inBurst(std::move(step))); }

void BrivoDevice::enumerateWhenClientsKeepUp(Task step) {
  const Connections connections = clientManager_->allClientConnections();
  const auto keepsUp = [](const auto& connection) { return !connection->isBacklogged(); };
  if (connections.empty() || std::ranges::any_of(connections, keepsUp))
    return enumerateConcurrently(std::move(step));
  // The walk goes as fast as the fastest client reads.
  const auto first = std::make_shared<std::atomic_flag>();
  for (const auto& connection : connections) {
    connection->whenNotBacklogged([first, lane = lane_, step] {
      if (!first->test_and_set()) lane->post(inBurst(step));
    });
  }
}

void BrivoDevice::replayContents(const std::shared_ptr<zeph::Connection>& connection) {
  addInitiatedOperation([this, connection] {
    sendReplayPart(std::make_shared<CatalogueReplay>(index_.copyIndexedFoldersAndFiles(), connection));
  });
}

void BrivoDevice::sendReplayPart(const std::shared_ptr<CatalogueReplay>& replay) {
  if (!replay->sendSome(notifications_)) return;
  const auto addNextPart = [replay](BrivoDevice& self) {
    self.addInitiatedOperation([&self, replay] { self.sendReplayPart(replay); });
  };
  if (replay->connection()->isBacklogged()) {
    replay->connection()->whenNotBacklogged(onOwnLane(addNextPart));
  } else {
    addNextPart(*this);
  }
}

}  // namespace brivo
