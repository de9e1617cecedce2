// SPDX-License-Identifier: MIT
#pragma once

#include <future>
#include <memory>

#include "orvidcore/result.h"
#include "platform/work/pool.h"
#include "platform/work/serial_queue.h"
#include "platform/zeph/connection_service.h"

namespace orvid {

/// The library's threads: the I/O thread and a pool. Held by everything that uses them. *Thread-safe.*
class Runtime {
 public:
  /// May be dropped by one of its own threads.
  static std::shared_ptr<Runtime> create();

  brivo::Pool& pool() { return pool_; }
  brivo::zeph::ConnectionService& connections() { return connections_; }
  /// A queue for the events of one object.
  std::shared_ptr<brivo::SerialQueue> makeQueue() { return brivo::SerialQueue::create(pool_); }

 private:
  Runtime() = default;

  brivo::Pool pool_;
  brivo::zeph::ConnectionService connections_{pool_, nullptr};
};

/// What a call that was not answered comes to.
Error errorOf(const brivo::zeph::CallError& error);

/// The dictionary that every answer with a value consists of.
Result<Dictionary> dictionaryOf(const brivo::zeph::Arguments& answer);

/// Starts an asynchronous call and waits for its outcome.
template <class T, class Start>
Result<T> blocking(Start start) {
  auto promise = std::make_shared<std::promise<Result<T>>>();
  auto outcome = promise->get_future();
  start([promise](Result<T> result) { promise->set_value(std::move(result)); });
  return outcome.get();
}

}  // namespace orvid
