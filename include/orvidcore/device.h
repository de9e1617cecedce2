// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "orvidcore/object.h"
#include "orvidcore/result.h"

namespace orvid {

/// What the device list says of one device.
struct DeviceInfo {
  /// The device's handle as long as its volume is there.
  std::string uuid;
  std::string name;
  std::string mountPath;
};

/// What a device tells while it is open. Every member may be empty; they run one at a time, on a thread of
/// the library, in the order of what happened.
struct DeviceEvents {
  /// The objects have been counted.
  std::function<void(std::int32_t objectCount)> onReady;
  std::function<void(const std::vector<ObjectInfo>&)> onItems;
  std::function<void(std::uint32_t percent)> onPercent;
  /// Bytes of an object that have been delivered, and their share of it.
  std::function<void(std::uint32_t handle, std::uint64_t bytes, double percent)> onProgress;
  /// The volume or the service has gone. Nothing comes after it.
  std::function<void()> onClosed;
};

class Session;

/// An open device. A process has one connection to a device, once: the session lasts until the volume goes or
/// the DeviceBrowser that opened it. *Thread-safe.*
class Device {
 public:
  explicit Device(std::shared_ptr<Session> session) : session_(std::move(session)) {}

  const DeviceInfo& info() const;
  /// Replaces what is told; what happened before is not told again.
  void setEvents(DeviceEvents events) const;

  /// Starts using the device: its property dictionary. ErrorKind::refused when this application may not.
  Result<Dictionary> start(Timeout timeout = kDefaultTimeout) const;
  void startAsync(Callback<Dictionary> done, Timeout timeout = kDefaultTimeout) const;

  /// Registers interest in types of events.
  Result<Done> registerInterests(const std::vector<std::string>& types,
                                 Timeout timeout = kDefaultTimeout) const;

  /// Has the catalogue sent; returns when that has begun. `options` as in docs/wire.md.
  Result<Done> enumerate(const Dictionary& options = {}, Timeout timeout = kDefaultTimeout) const;
  void enumerateAsync(const Dictionary& options, Callback<Done> done,
                      Timeout timeout = kDefaultTimeout) const;

  /// The whole catalogue, folders first, once it has settled: when as many objects have arrived as were
  /// counted, or none for one second. Starts and enumerates the device when that has not been done.
  Result<std::vector<Object>> catalogue(Timeout timeout = kDefaultTimeout) const;
  void catalogueAsync(Callback<std::vector<Object>> done, Timeout timeout = kDefaultTimeout) const;

  /// An object that has arrived already; none else.
  std::optional<Object> object(std::uint32_t handle) const;

 private:
  std::shared_ptr<Session> session_;
};

}  // namespace orvid
