// SPDX-License-Identifier: MIT
// The protocols between the service and its clients, one row per member.
#pragma once

#include <initializer_list>
#include <string_view>
#include <utility>

#include "platform/zeph/protocol.h"

namespace brivo {

/// OVZEPHDeviceManagerProtocol: the device list, opening a device, devices that come and go.
const zeph::Protocol& deviceManagerProtocol();

/// KorvelProtocol: a session with one device.
const zeph::Protocol& korvelProtocol();

/// FrontDoor1: what the service has on the session bus. Its methods hand out connections that speak the other
/// two.
const zeph::Protocol& frontDoorProtocol();

/// What argument 0 of a restricted selector may be made of.
const zeph::ClassSet& allowedClasses();

/// Restricts argument 0 of the selector's call (origin 0) or of its reply (origin 1) to the allowed classes.
void addSelectorToInterface(zeph::Interface& interface, std::string_view selector, int origin);

/// The protocol with these selectors restricted.
zeph::Interface restrictedInterface(
    const zeph::Protocol& protocol,
    std::initializer_list<std::pair<std::string_view, int>> selectorsAndOrigins);

}  // namespace brivo
