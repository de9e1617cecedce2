// SPDX-License-Identifier: MIT
// What items need of the device that they belong to.
#pragma once

#include <cstdint>
#include <memory>
#include <string>

#include "platform/base/value.h"
#include "platform/files/file_system.h"
#include "platform/work/serial_queue.h"
#include "platform/work/task.h"

namespace brivo {

class BrivoItem;
class ImageDecoder;
class MetadataArchive;
class MovieService;
class ReadMemory;

/// Owned by the device's side; items know it by this alone, and do not own it. *Thread-safe.*
class CameraDevice : public std::enable_shared_from_this<CameraDevice> {
 public:
  virtual ~CameraDevice() = default;

  /// The volume's name; empty until a client has started using the device.
  virtual std::string name() const = 0;
  /// The volume is mounted read-only.
  virtual bool isLocked() const = 0;
  /// A client asked for fast enumeration: what may come later should.
  virtual bool prioritizeSpeed() const = 0;
  virtual bool beingEjected() const = 0;
  virtual FileSystem& files() const = 0;

  virtual void addCameraFileToIndex(const std::shared_ptr<BrivoItem>& item) = 0;
  virtual void addCameraFolderToIndex(const std::shared_ptr<BrivoItem>& item) = 0;
  /// The indexed item with this handle; null when there is none.
  virtual std::shared_ptr<BrivoItem> cameraItemWithObjectID(std::uint64_t handle) const = 0;
  /// Sends serialised datasets to all clients as one content batch.
  virtual void flushNotifications(Array datasets) = 0;

  /// Where the metadata of the device's pictures are kept.
  virtual MetadataArchive& metadataArchive() = 0;

  /// What bytes of the device's files are read into for clients.
  virtual ReadMemory& readMemory() = 0;
  virtual ImageDecoder& imageDecoder() const = 0;
  /// Reads the movies of all devices; outlives the device.
  virtual MovieService& movies() const = 0;

  /// A queue of its own for work on one of the device's files.
  virtual std::shared_ptr<SerialQueue> makeSerialQueue() = 0;
  /// Queues an operation behind the requests of clients.
  virtual void addInitiatedOperation(Task operation) = 0;
  /// Runs a step of an enumeration on the device's share of the pool.
  virtual void enumerateConcurrently(Task step) = 0;
  /// The same, but not before a client has room for what the step will send.
  virtual void enumerateWhenClientsKeepUp(Task step) = 0;
};

}  // namespace brivo
