// SPDX-License-Identifier: MIT
#include "device/catalogue_replay.h"

#include <utility>

#include "content/dcf_names.h"
#include "protocol/selectors.h"

namespace brivo {

namespace {

constexpr int kBatchesPerPart = 128;

}  // namespace

bool CatalogueReplay::sendSome(const DeviceNotifications& notifications) {
  for (int sent = 0; next_ < items_.size(); ++next_) {
    const BrivoItem& item = *items_[next_];
    if (startsGroup(item) && !batch_.empty()) {
      sendBatch(notifications);
      if (++sent == kBatchesPerPart) return true;  // the item's turn comes with the next part
    }
    batch_.append(item.info().content());
  }
  sendBatch(notifications);
  return false;
}

bool CatalogueReplay::startsGroup(const BrivoItem& item) {
  const Group group{baseImageFilePrefix(item.name()), baseImageFileDigits(item.name())};
  const Group before = std::exchange(group_, group);
  return before != Group() && before != group;
}

void CatalogueReplay::sendBatch(const DeviceNotifications& notifications) {
  notifications.sendNotification(notifications.contentBatch(std::exchange(batch_, Array(Array::Kind::data))),
                                 Connections{connection_}, selectors::kNotifyAddedItems);
}

}  // namespace brivo
