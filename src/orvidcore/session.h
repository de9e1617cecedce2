// SPDX-License-Identifier: MIT
#pragma once

#include <functional>
#include <memory>
#include <string_view>

#include "orvidcore/catalogue.h"
#include "orvidcore/device.h"
#include "orvidcore/lent_buffers.h"
#include "orvidcore/runtime.h"
#include "platform/base/mutex.h"
#include "platform/zeph/connection.h"

namespace orvid {

/// The connection to one device and what has arrived over it. *Thread-safe.* Handlers run on the connection's
/// queue and must not block; events and asynchronous outcomes go on to a queue of their own.
class Session final : public brivo::zeph::ExportedObject, public std::enable_shared_from_this<Session> {
 public:
  using Handler = std::function<void(Result<brivo::zeph::Arguments>)>;

  static Result<std::shared_ptr<Session>> open(std::shared_ptr<Runtime> runtime, const DeviceInfo& info,
                                               const brivo::Endpoint& endpoint, Timeout timeout);
  ~Session() override;

  const DeviceInfo& info() const { return info_; }
  Catalogue& catalogue() { return catalogue_; }
  LentBuffers& lentBuffers() { return lentBuffers_; }
  void setEvents(DeviceEvents events) BRIVO_EXCLUDES(mutex_);
  void close() { connection_->invalidate(); }
  /// The device has gone: what is called from now on fails, and the last event is told. Once; then nothing.
  void ended();
  /// Waits until no event is being told any more, after ended().
  void waitForEvents();

  /// Calls the device; a connection that ends before its first answer was refused.
  void call(std::string_view selector, brivo::zeph::Arguments arguments, Timeout timeout, Handler handler);
  /// Calls the device about one object: the result dictionary, an error when its code is not 0.
  void request(std::string_view selector, std::uint32_t handle, Dictionary options, Timeout timeout,
               Callback<Dictionary> handler);

  void start(Timeout timeout, Callback<Dictionary> handler);
  void enumerate(const Dictionary& options, Timeout timeout, Callback<Done> handler);
  /// Starts, enumerates and waits, blocking.
  Result<Done> settle(Timeout timeout);

  /// `callback` as a handler: it runs on the queue of events.
  template <class T>
  Callback<T> onEventQueue(Callback<T> callback) {
    return [queue = events_, callback = std::move(callback)](Result<T> result) {
      queue->post([callback, result = std::move(result)] { callback(result); });
    };
  }
  /// Runs a blocking task on the library's threads.
  void runInBackground(brivo::Task task) { runtime_->pool().post(std::move(task)); }

  void handle(brivo::zeph::Invocation invocation) override;

 private:
  Session(std::shared_ptr<Runtime> runtime, DeviceInfo info,
          std::shared_ptr<brivo::zeph::Connection> connection);

  void receivedNote(const Dictionary& note);
  void receivedItems(const Dictionary& batch);
  /// What calls come to when the connection has ended.
  Error ending() const;
  /// Runs `tell` with the events on their queue.
  void post(std::function<void(const DeviceEvents&)> tell);
  std::shared_ptr<const DeviceEvents> told() const BRIVO_EXCLUDES(mutex_);

  const std::shared_ptr<Runtime> runtime_;
  const DeviceInfo info_;
  const std::shared_ptr<brivo::zeph::Connection> connection_;
  const std::shared_ptr<brivo::SerialQueue> events_;
  Catalogue catalogue_;
  LentBuffers lentBuffers_;
  std::atomic<bool> answered_ = false;
  std::atomic<bool> enumerated_ = false;
  std::atomic<bool> ended_ = false;
  bool lastEventTold_ = false;  // on the queue of events

  mutable brivo::Mutex mutex_;
  std::shared_ptr<const DeviceEvents> told_ BRIVO_GUARDED_BY(mutex_) = std::make_shared<const DeviceEvents>();
};

}  // namespace orvid
