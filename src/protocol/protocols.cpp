// SPDX-License-Identifier: MIT
#include "protocol/protocols.h"

#include "protocol/selectors.h"

namespace brivo {

namespace {

using zeph::Member;
using enum Member::Kind;
constexpr auto kDeclaredOnly = Member::Serving::declaredOnly;

constexpr Member kManagerMembers[] = {
    {selectors::kRequestDeviceList, method, "", "a{sv}", "deviceList,"},
    {selectors::kOpenDevice, method, "s", "a{sv}", "uuid,device,"},
    {selectors::kCloseDevice, method, "s", "a{sv}", "uuid,result,", kDeclaredOnly},
    {selectors::kNotifyAddedDevice, signal, "a{sv}", "", "deviceContext,"},
    {selectors::kNotifyRemovedDevice, signal, "a{sv}", "", "deviceContext,"},
};

constexpr Member kKorvelMembers[] = {
    {selectors::kOpenDeviceSession, method, "", "", "", kDeclaredOnly},
    {selectors::kSendPTPCommand, method, "", "", "", kDeclaredOnly},
    {selectors::kRequestMetadata, method, "ta{sv}", "a{sv}", "handle,options,metadata,"},
    {selectors::kRequestThumbnail, method, "ta{sv}", "a{sv}", "handle,options,thumbnail,"},
    {selectors::kRequestDownload, method, "ta{sv}", "a{sv}", "handle,options,result,"},
    {selectors::kRequestReadData, method, "ta{sv}", "a{sv}", "handle,options,result,"},
    {selectors::kOrvidEvent, signal, "v", "", "event,", kDeclaredOnly},
    {selectors::kRequestDelete, method, "ta{sv}", "a{sv}", "handle,options,result,"},
    {selectors::kRequestStartUsing, method, "", "a{sv}", "properties,"},
    {selectors::kEnumerateContent, method, "a{sv}", "", "options,"},
    {selectors::kPtpEventForwarding, method, "", "", "", kDeclaredOnly},
    {selectors::kRegisterInterests, method, "as", "", "types,"},
    {selectors::kUnregisterInterests, method, "as", "", "types,"},
    {selectors::kPostNotification, signal, "a{sv}", "", "note,"},
    {selectors::kNotifyAddedItems, signal, "a{sv}", "", "batch,"},
    {selectors::kNotifyPtpEvent, signal, "v", "", "event,", kDeclaredOnly},
    {selectors::kNotifyPercentCompleted, signal, "u", "", "percent,"},
    {selectors::kNotifyDeviceClose, signal, "v", "", "location,", kDeclaredOnly},
};

constexpr Member kFrontDoorMembers[] = {
    {selectors::kDoorOpenManager, method, "", "h", "socket,"},
    {selectors::kDoorOpenDevice, method, "s", "ha{sv}", "uuid,socket,device,"},
};

constexpr zeph::Protocol kManagerProtocol{"org.orvid.OVZEPHDeviceManagerProtocol", kManagerMembers};
constexpr zeph::Protocol kKorvelProtocol{"org.orvid.KorvelProtocol", kKorvelMembers};
constexpr zeph::Protocol kFrontDoorProtocol{"org.orvid.FrontDoor1", kFrontDoorMembers};

}  // namespace

const zeph::Protocol& deviceManagerProtocol() { return kManagerProtocol; }
const zeph::Protocol& korvelProtocol() { return kKorvelProtocol; }
const zeph::Protocol& frontDoorProtocol() { return kFrontDoorProtocol; }

const zeph::ClassSet& allowedClasses() {
  using enum Value::Class;
  static const zeph::ClassSet classes{dictionary, array,    url,      string, number,
                                      data,       endpoint, indexSet, error};
  return classes;
}

void addSelectorToInterface(zeph::Interface& interface, std::string_view selector, int origin) {
  interface.setClasses(allowedClasses(), selector,
                       origin == 1 ? zeph::Interface::Origin::reply : zeph::Interface::Origin::argument);
}

zeph::Interface restrictedInterface(
    const zeph::Protocol& protocol,
    std::initializer_list<std::pair<std::string_view, int>> selectorsAndOrigins) {
  zeph::Interface interface(protocol);
  for (const auto& [selector, origin] : selectorsAndOrigins)
    addSelectorToInterface(interface, selector, origin);
  return interface;
}

}  // namespace brivo
