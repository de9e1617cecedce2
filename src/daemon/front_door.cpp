// SPDX-License-Identifier: MIT
#include "daemon/front_door.h"

#include "protocol/selectors.h"

namespace brivo {

namespace {

void openDevice(MSRemoteCameraDeviceManager& manager, const zeph::Visit& visit) {
  const std::string& uuid = *visit.arguments[0].get<std::string>();
  if (!manager.remoteDeviceForUUID(uuid)) return visit.reply.fail(FrontDoor::unknownDevice());
  Dictionary properties = manager.openDevice(uuid);
  auto listener = manager.listenerOfDevice(uuid);
  if (!listener) return visit.reply.fail({zeph::kErrorFailed, "The device cannot be opened"});
  visit.reply({std::move(listener), {std::move(properties)}});
}

}  // namespace

void FrontDoor::visited(zeph::Visit visit) {
  if (visit.selector == selectors::kDoorOpenManager) return visit.reply({managerListener_, {}});
  mainLoop_.post([weak = manager_, visit = std::move(visit)] {
    if (const auto manager = weak.lock()) openDevice(*manager, visit);
  });
}

}  // namespace brivo
