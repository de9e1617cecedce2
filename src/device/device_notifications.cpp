// SPDX-License-Identifier: MIT
#include "device/device_notifications.h"

#include "protocol/keys.h"
#include "protocol/selectors.h"
#include "util/log.h"

namespace brivo {

namespace {

/// A dictionary of the keys' own strings.
Dictionary dictionaryOf(std::initializer_list<std::pair<std::string_view, Value>> entries) {
  Dictionary dictionary;
  for (const auto& [key, value] : entries) dictionary.set(key, value);
  return dictionary;
}

Value taggedWith(const std::string& uuid, const Value& note) {
  Dictionary tagged = note.get<Dictionary>() ? *note.get<Dictionary>() : Dictionary();
  tagged.set(keys::kInternalDeviceUUID, uuid);
  return tagged;
}

}  // namespace

void DeviceNotifications::sendNotification(Value note, const std::optional<Connections>& toConnections,
                                           std::optional<std::string_view> selector) const {
  const Connections connections = toConnections ? *toConnections : clients_.allClientConnections();
  if (connections.empty()) return;
  if (!selector) note = taggedWith(internalUUID_(), note);
  const std::string_view member = selector.value_or(selectors::kPostNotification);
  const auto arguments = std::make_shared<const zeph::Arguments>(zeph::Arguments{std::move(note)});
  for (const auto& connection : connections) {
    const auto proxy = connection->remoteObjectProxyWithErrorHandler(nullptr);  // who is gone does not hear
    OVLogVerbose(kLogTypeDetail, "sendNote", "[{:05}] --> {}", connection->processIdentifier(), member);
    proxy.send(member, arguments);
  }
}

void DeviceNotifications::sendNotification(Value note, const std::string& noteType,
                                           std::string_view selector) const {
  sendNotification(std::move(note), clients_.clientConnectionsMonitoringNotification(noteType), selector);
}

void DeviceNotifications::sendNotificationDownloadProgressForObject(std::uint32_t handle,
                                                                    std::uint64_t downloadedBytes,
                                                                    double percentComplete) const {
  const Connections connections = clients_.clientConnectionsMonitoringObjectID(handle);
  if (connections.empty()) return;
  sendNotification(dictionaryOf({{keys::kType, keys::kDownloadProgress},
                                 {keys::kDownloadedBytes, downloadedBytes},
                                 {keys::kDownloadedPercent, percentComplete},
                                 {keys::kObjectID, handle}}),
                   connections);
}

void DeviceNotifications::sendNotificationContentCatalogPercentCompleted() const {
  sendNotification(counters_.contentCatalogPercentCompleted(), std::nullopt,
                   selectors::kNotifyPercentCompleted);
}

void DeviceNotifications::sendDeviceIsReady() const {
  const std::int32_t count = counters_.preflightCount();
  OVLog("enumerateContent", "OVDeviceIsReady: {}", count);
  sendNotification(
      dictionaryOf({{keys::kType, keys::kDeviceIsReady}, {keys::kNumberOfPreflightObjects, count}}));
}

void DeviceNotifications::flushNotifications(Array datasets) const {
  sendNotification(contentBatch(std::move(datasets)), std::nullopt, selectors::kNotifyAddedItems);
}

Dictionary DeviceNotifications::contentBatch(Array datasets) const {
  Dictionary batch;
  batch.set(keys::kObjectInfoArray, std::move(datasets));
  batch.set(keys::kNumberOfDownloadableObjects, counters_.msObjectCount());
  batch.set(keys::kContentCatalogPercentCompleted, counters_.contentCatalogPercentCompleted());
  return batch;
}

}  // namespace brivo
