// SPDX-License-Identifier: MIT
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>

#include "content/brivo_item.h"
#include "content/media/brivo_file.h"
#include "device/device_notifications.h"
#include "device/object_index.h"
#include "device/read_buffers.h"
#include "io/read_memory.h"
#include "platform/base/value.h"

namespace brivo {

/// Serves the requests for single objects. Each answers exactly once; what a request's options held comes
/// back in its result where docs/wire.md says so. *Thread-bound* to the device's operation queue.
class ObjectRequests {
 public:
  /// All must outlive this.
  ObjectRequests(ObjectIndex& index, const DeviceNotifications& notifications, ReadMemory& memory);

  void requestMetadataForObjectHandle(std::uint64_t handle, const Dictionary& options,
                                      const ResultHandler& reply);
  void requestThumbnailDataForObjectHandle(std::uint64_t handle, const Dictionary& options,
                                           const ResultHandler& reply);
  /// Always refused: clients read ranges.
  static void requestDownloadObjectHandle(const Dictionary& options, const ResultHandler& reply);
  /// A byte range, in memory of the service or in the client's own, or, with the stream options, opens or
  /// closes the object's stream for the process `client`.
  void requestReadDataFromObjectHandle(std::uint64_t handle, const Dictionary& options, std::int32_t client,
                                       const ResultHandler& reply);
  void requestDeleteObjectHandle(std::uint64_t handle, const Dictionary& options, const ResultHandler& reply);

  /// Closes the streams that a client process left open, so that the volume can be unmounted, and forgets the
  /// memory it lent.
  void forgetClient(std::int32_t client);
  /// Closes all streams. No request may come after it.
  void closeAllStreams();

 private:
  /// Read-ahead caches of one device at a time, each of up to 12 MiB: further streams are read directly.
  static constexpr std::size_t kMostCaches = 16;

  struct Range {
    std::uint64_t offset;
    std::uint64_t length;
    std::int32_t code;
  };
  /// The range that the options ask for, and whether the object has it.
  static Range rangeOf(const Dictionary& options, std::uint64_t size);

  void openStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client, bool readAhead);
  void closeStream(const std::shared_ptr<BrivoFile>& file, std::int32_t client);
  /// Closes all streams of an object that is gone: no request reaches them any more.
  void closeStreamsOn(const BrivoItem* item);
  std::size_t cacheCount() const;

  Dictionary readRange(BrivoFile* file, const Range& range, const Dictionary& options);
  /// The same into the memory that `buffer` stands for.
  Dictionary readIntoBuffer(BrivoFile* file, Range range, const Dictionary& options, const Value& buffer,
                            std::int32_t client);
  Data read(BrivoFile& file, const Range& range);
  void tellProgress(const BrivoFile& file, std::uint64_t delivered) const;

  ObjectIndex& index_;
  const DeviceNotifications& notifications_;
  ReadMemory& memory_;  // for what was not read ahead
  ReadBuffers buffers_;
  /// Files by the process that has them open, once for each time.
  std::multimap<std::int32_t, std::shared_ptr<BrivoFile>> openStreams_;
};

}  // namespace brivo
