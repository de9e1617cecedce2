// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "card.h"
#include "service_process.h"
#include "wire_client.h"

namespace brivo::bench {

inline constexpr const char* kManagerInterface = "org.orvid.OVZEPHDeviceManagerProtocol";
inline constexpr const char* kDeviceInterface = "org.orvid.KorvelProtocol";

/// One card behind a service process, opened and started by a WireClient.
class WireSession {
 public:
  /// Of a service that has just been started for this card. `card` must outlive this. Throws when the device
  /// cannot be opened.
  explicit WireSession(const Card& card);
  /// Of a service that serves this card and others.
  WireSession(const Card& card, std::shared_ptr<const ServiceProcess> service);

  const ServiceProcess& service() const { return *service_; }
  WireClient& device() { return device_; }
  /// Where other processes reach the device.
  const std::string& deviceSocket() const { return deviceSocket_; }
  /// Asks for the catalogue and reads until all files of the card have come; gives the milliseconds.
  double enumerate();

 private:
  /// The path of the device's socket.
  std::string openDevice();

  const Card& card_;
  const std::shared_ptr<const ServiceProcess> service_;
  WireClient manager_;
  const std::string deviceSocket_;
  WireClient device_;
};

/// A marshalled dictionary without entries.
std::string noOptions();

}  // namespace brivo::bench
