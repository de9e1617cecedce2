// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "device/catalogue_counters.h"
#include "device/device_notifications.h"
#include "device/object_index.h"
#include "platform/base/mutex.h"
#include "platform/zeph/connection.h"

namespace brivo {

/// The device's side of enumerating its content: the first time preflight counts the objects, says that the
/// device is ready and starts the walks; later times the catalogue is replayed to whoever asks.
/// *Thread-safe.*
class ContentEnumeration {
 public:
  /// Where the media are, once a client has started using the device.
  struct Store {
    std::string name;
    std::string volumePath;
    /// Relative to the volume.
    std::vector<std::string> mediaPaths;
  };
  /// What enumeration asks of its device.
  class Host {
   public:
    virtual ~Host() = default;
    /// None until a client has started using the device.
    virtual std::optional<Store> store() const = 0;
    virtual void replayContents(const std::shared_ptr<zeph::Connection>& connection) = 0;
  };

  /// All must outlive this.
  ContentEnumeration(CameraDevice& device, Host& host, ObjectIndex& index, CatalogueCounters& counters,
                     const DeviceNotifications& notifications)
      : device_(device), host_(host), index_(index), counters_(counters), notifications_(notifications) {}

  /// Enumerates for the client at `connection`, and calls `done` when walks or replay are under way, here or
  /// on the thread of a caller that was first. Blocks as long as the medium does.
  void enumerateContentWithOptions(const Dictionary& options,
                                   const std::shared_ptr<zeph::Connection>& connection,
                                   std::function<void()> done) BRIVO_EXCLUDES(mutex_);

  /// A client asked for fast enumeration; never taken back.
  bool prioritizeSpeed() const { return prioritizeSpeed_; }

  /// Counts the objects on the device and tells all clients that it is ready.
  void preflight(const Store& store);

 private:
  enum class Progress { notBegun, beginning, filledStorageCache };
  struct Caller {
    Dictionary options;
    std::shared_ptr<zeph::Connection> connection;
    std::function<void()> done;
  };

  void enumerateFirst(const Dictionary& options);
  void enumerateAgain(const std::shared_ptr<zeph::Connection>& connection);
  /// The counts of one media folder.
  void preflightFolder(const std::string& tag, const std::string& path);
  void preflightSubFolder(const std::string& tag, const std::string& path, const std::string& name);

  CameraDevice& device_;
  Host& host_;
  ObjectIndex& index_;
  CatalogueCounters& counters_;
  const DeviceNotifications& notifications_;
  std::atomic<bool> prioritizeSpeed_ = false;

  Mutex mutex_;
  Progress progress_ BRIVO_GUARDED_BY(mutex_) = Progress::notBegun;
  std::vector<Caller> waiting_ BRIVO_GUARDED_BY(mutex_);  // for the one that is first
};

}  // namespace brivo
