// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "device/catalogue_counters.h"
#include "device/clients/client_manager.h"
#include "platform/base/value.h"

namespace brivo {

/// Pushes events to the clients of one device. Every send is one-way and never waits for a client.
/// *Thread-safe.*
class DeviceNotifications {
 public:
  /// `internalUUID` gives the identifier that generic notes carry. All must outlive this.
  DeviceNotifications(const OVClientManager& clients, const CatalogueCounters& counters,
                      std::function<std::string()> internalUUID)
      : clients_(clients), counters_(counters), internalUUID_(std::move(internalUUID)) {}

  /// Sends a note to the given connections; no list means all clients, an empty one nobody. Without a
  /// selector it goes out as a generic event, with "OVInternalDeviceUUID" added.
  void sendNotification(Value note, const std::optional<Connections>& toConnections = std::nullopt,
                        std::optional<std::string_view> selector = std::nullopt) const;
  /// Sends a note to the clients that are interested in its type.
  void sendNotification(Value note, const std::string& noteType, std::string_view selector) const;
  /// Tells whoever works on the object how much of it was delivered, in bytes and in percent.
  void sendNotificationDownloadProgressForObject(std::uint32_t handle, std::uint64_t downloadedBytes,
                                                 double percentComplete) const;
  void sendNotificationContentCatalogPercentCompleted() const;
  /// Tells all clients how many objects preflight counted.
  void sendDeviceIsReady() const;
  /// Sends serialised datasets to all clients as one content batch.
  void flushNotifications(Array datasets) const;

  /// A content batch with the counts of this moment.
  Dictionary contentBatch(Array datasets) const;

 private:
  const OVClientManager& clients_;
  const CatalogueCounters& counters_;
  const std::function<std::string()> internalUUID_;
};

}  // namespace brivo
