// SPDX-License-Identifier: MIT
#pragma once

#include <memory>
#include <vector>

#include "content/brivo_item.h"
#include "device/device_notifications.h"
#include "platform/zeph/connection.h"

namespace brivo {

/// Sends a device's catalogue, as it was when the replay was made, to one late client: one batch per DCF
/// group, in parts, so that requests come in between and the client has time to read. *Thread-bound* to the
/// one part that runs.
class CatalogueReplay {
 public:
  CatalogueReplay(std::vector<std::shared_ptr<BrivoItem>> items, std::shared_ptr<zeph::Connection> connection)
      : items_(std::move(items)), connection_(std::move(connection)) {}

  const std::shared_ptr<zeph::Connection>& connection() const { return connection_; }

  /// Sends the next part; true when more is left.
  bool sendSome(const DeviceNotifications& notifications);

 private:
  /// What the names of one shot's files have in common; 0 stands for none.
  struct Group {
    std::int32_t prefix = 0;
    std::int32_t digits = 0;
    friend bool operator==(const Group&, const Group&) = default;
  };

  /// True when `item` belongs to another group than the one before it.
  bool startsGroup(const BrivoItem& item);
  void sendBatch(const DeviceNotifications& notifications);

  const std::vector<std::shared_ptr<BrivoItem>> items_;
  const std::shared_ptr<zeph::Connection> connection_;

  std::size_t next_ = 0;
  Group group_;
  Array batch_{Array::Kind::data};
};

}  // namespace brivo
