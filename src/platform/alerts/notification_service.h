// SPDX-License-Identifier: MIT
#pragma once

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "platform/base/result.h"
#include "platform/work/run_loop.h"

struct sd_bus;
struct sd_bus_message;

namespace brivo {

/// The notification server of the session bus, "org.freedesktop.Notifications" (Desktop Notifications
/// Specification 1.2). Nothing here waits: answers come on the loop, and a server that is not running is
/// started by the bus when it can. *Thread-bound* to the loop.
class NotificationService {
 public:
  /// Where a notification is: the unique name of its server, and the server's number for it.
  struct Place {
    std::string server;
    std::uint32_t id = 0;
    friend bool operator==(const Place&, const Place&) = default;
  };
  struct Notice {
    std::string title;
    std::string body;
    std::vector<std::pair<std::string, std::string>> actions;  ///< keys and labels
  };
  /// Why there is no answer: nobody is there to give one, or the server refuses or makes no sense.
  enum class Failure { noServer, refused };
  template <class T>
  using Handler = std::function<void(const Result<T, Failure>&)>;
  /// What the server tells. `Place::server` is always who really sent it.
  struct Events {
    std::function<void(const Place&, const std::string& key)> onAction;
    std::function<void(const Place&)> onClosed;
    /// Another connection, or none (""), is the server now.
    std::function<void(const std::string& server)> onServer;
    /// The bus has gone. Whatever was still asked has failed before.
    std::function<void()> onBusGone;
  };

  /// Works on `loop`, which must outlive this.
  NotificationService(RunLoop& loop, Events events) : loop_(loop), events_(std::move(events)) {}
  /// Loop thread, or when the loop does not run any more.
  ~NotificationService() { disconnect(); }
  NotificationService(const NotificationService&) = delete;
  NotificationService& operator=(const NotificationService&) = delete;

  /// Connects when that has not been done. False when there is no session bus.
  bool connect();
  /// Leaves the bus, and drops what is still asked: its handlers are not called. Not from a handler of this.
  void disconnect();
  /// Waits until what was asked has been answered, and calls the handlers; `limit` at most. On the loop's
  /// thread, or when the loop does not run any more; not from a handler.
  void awaitAnswers(std::chrono::milliseconds limit);

  /// What the server can do.
  void askCapabilities(const Handler<std::vector<std::string>>& onAnswer);
  /// Shows a notification that stays until somebody answers.
  void post(const Notice& notice, const Handler<Place>& onAnswer);
  /// Takes a notification from the screen, if it is still there.
  void close(const Place& place);

 private:
  /// Hears the answer or the error; null when the call could not be sent.
  using Answer = std::function<void(sd_bus_message* answer)>;

  struct Handlers;
  struct Question;

  int open();
  int listen();
  void call(sd_bus_message* message, Answer onAnswer);

  RunLoop& loop_;
  const Events events_;
  sd_bus* bus_ = nullptr;
  std::size_t questions_ = 0;  // that have no answer yet
};

}  // namespace brivo
