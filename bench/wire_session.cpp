// SPDX-License-Identifier: MIT
#include "wire_session.h"

#include <stdexcept>

#include "figures.h"
#include "marshalled_options.h"
#include "support/raw_dbus.h"
#include "support/wait.h"

namespace brivo::bench {

namespace {

/// What the name of every file begins with, in the UTF-16 of a dataset.
constexpr std::string_view kBeginOfName("I\0M\0G\0_\0", 8);

}  // namespace

WireSession::WireSession(const Card& card)
    : WireSession(card, std::make_shared<const ServiceProcess>(card.volumes())) {}

WireSession::WireSession(const Card& card, std::shared_ptr<const ServiceProcess> service)
    : card_(card),
      service_(std::move(service)),
      manager_(WireClient::authenticated(service_->managerSocket())),
      deviceSocket_(openDevice()),
      device_(WireClient::authenticated(deviceSocket_)) {
  device_.call(kDeviceInterface, "requestStartUsingDeviceWithReply");
}

std::string WireSession::openDevice() {
  std::string devices;
  std::size_t listed = std::string::npos;
  const auto listsTheCard = [&] {
    devices = manager_.call(kManagerInterface, "requestDeviceListWithReply");
    listed = devices.find(card_.path());
    return listed != std::string::npos;
  };
  if (!test::waitUntil(listsTheCard)) throw std::runtime_error("no device for " + card_.path());
  const std::string handle = textUnder("OVDeviceHandle", devices, listed);  // behind the card's path
  const std::string opened =
      manager_.call(kManagerInterface, "openDevice_withReply", "s", test::marshalledString(handle));
  const std::string address = textUnder("OVDeviceEndpoint", opened);
  return address.substr(address.find('/'));
}

double WireSession::enumerate() {
  const Stopwatch watch;
  device_.post(kDeviceInterface, "enumerateContentWithOptions", "a{sv}", noOptions());
  device_.receiveUntil(kBeginOfName, card_.files());
  return watch.milliseconds();
}

std::string noOptions() { return MarshalledOptions().bytes(); }

}  // namespace brivo::bench
