// SPDX-License-Identifier: MIT
#include "device/device_service.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>

#include "device/brivo_device.h"
#include "protocol/protocols.h"
#include "protocol/selectors.h"
#include "util/log.h"

namespace brivo {

namespace {

/// Both sides of a connection speak the one protocol.
const zeph::Interface& korvelInterface() {
  static const zeph::Interface interface =
      restrictedInterface(korvelProtocol(), {{selectors::kOrvidEvent, 1},
                                             {selectors::kPostNotification, 0},
                                             {selectors::kNotifyAddedItems, 0},
                                             {selectors::kNotifyPtpEvent, 0},
                                             {selectors::kNotifyPercentCompleted, 0},
                                             {selectors::kRegisterInterests, 0},
                                             {selectors::kUnregisterInterests, 0},
                                             {selectors::kRequestThumbnail, 1},
                                             {selectors::kRequestMetadata, 1},
                                             {selectors::kRequestDownload, 1},
                                             {selectors::kRequestDelete, 1},
                                             {selectors::kRequestReadData, 1}});
  return interface;
}

std::vector<std::string> stringsOf(const Value& value) {
  std::vector<std::string> strings;
  for (const Value& element : *value.get<Array>()) strings.push_back(*element.get<std::string>());
  return strings;
}

ResultHandler resultHandler(const zeph::Reply& reply) {
  return [reply](Dictionary result) { reply({std::move(result)}); };
}

std::int32_t callerOf(const zeph::Invocation& call) { return call.connection->processIdentifier(); }
std::uint64_t handleOf(const zeph::Invocation& call) { return *call.arguments[0].asUnsigned(); }
const Dictionary& optionsOf(const zeph::Invocation& call) { return *call.arguments[1].get<Dictionary>(); }

void requestStartUsing(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestStartUsingDeviceWithReply(resultHandler(call.reply));
}
void enumerateContent(BrivoDevice& device, const zeph::Invocation& call) {
  device.enumerateContentWithOptions(*call.arguments[0].get<Dictionary>(), call.connection,
                                     [reply = call.reply] { reply({}); });
}
void registerInterests(BrivoDevice& device, const zeph::Invocation& call) {
  device.registerInterestedEventNotifications(stringsOf(call.arguments[0]), callerOf(call),
                                              [reply = call.reply] { reply({}); });
}
void unregisterInterests(BrivoDevice& device, const zeph::Invocation& call) {
  device.unregisterInterestedEventNotifications(stringsOf(call.arguments[0]), callerOf(call),
                                                [reply = call.reply] { reply({}); });
}
void requestMetadata(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestMetadataForObjectHandle(handleOf(call), optionsOf(call), resultHandler(call.reply));
}
void requestThumbnail(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestThumbnailDataForObjectHandle(handleOf(call), optionsOf(call), resultHandler(call.reply));
}
void requestDownload(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestDownloadObjectHandle(handleOf(call), optionsOf(call), resultHandler(call.reply));
}
void requestReadData(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestReadDataFromObjectHandle(handleOf(call), optionsOf(call), callerOf(call),
                                         resultHandler(call.reply));
}
void requestDelete(BrivoDevice& device, const zeph::Invocation& call) {
  device.requestDeleteObjectHandle(handleOf(call), optionsOf(call), resultHandler(call.reply));
}

struct Row {
  std::string_view selector;
  void (*handle)(BrivoDevice&, const zeph::Invocation&);
};

constexpr std::array<Row, 9> kServed{{{selectors::kRequestReadData, requestReadData},
                                      {selectors::kRequestThumbnail, requestThumbnail},
                                      {selectors::kRequestMetadata, requestMetadata},
                                      {selectors::kRequestDelete, requestDelete},
                                      {selectors::kRequestDownload, requestDownload},
                                      {selectors::kRequestStartUsing, requestStartUsing},
                                      {selectors::kEnumerateContent, enumerateContent},
                                      {selectors::kRegisterInterests, registerInterests},
                                      {selectors::kUnregisterInterests, unregisterInterests}}};

}  // namespace

bool DeviceService::acceptConnection(const zeph::Connection& connection) {
  const auto identifier = services_.codeSigningIdentifier(connection.auditToken());
  if (!services_.access || !identifier) return false;
  // The identifier of a process that has ended may be another one's now, which gets a decision of its own.
  std::erase_if(decided_, [](const auto& entry) { return !entry.second.isAlive(); });
  const std::string signingKey = fmt::format("{}-{}", *identifier, connection.processIdentifier());
  if (!decided_.emplace(signingKey, connection.auditToken()).second) return false;
  bool enabled = false;
  return services_.access->applicationWithBundleIdentifierHasAccess(*identifier, enabled) && enabled;
}

bool DeviceService::shouldAcceptNewConnection(zeph::Listener&,
                                              const std::shared_ptr<zeph::Connection>& connection) {
  if (!acceptConnection(*connection)) return false;
  connection->setExportedInterface(korvelInterface());
  connection->setRemoteObjectInterface(korvelInterface());
  connection->setExportedObject(device_.exportedObject());
  connection->acceptBuffers();
  OVLog("clientManager", "{} clients", device_.numberOfClients());
  device_.clientManager().addClientWithConnection(connection);
  connection->resume();
  return true;
}

void DeviceService::handle(zeph::Invocation invocation) {
  const auto row = std::ranges::find(kServed, invocation.selector, &Row::selector);
  if (row == kServed.end())
    return invocation.reply.fail({zeph::kErrorUnknownMethod, "Not served by a device"});
  row->handle(device_, invocation);
}

}  // namespace brivo
