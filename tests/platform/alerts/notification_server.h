// SPDX-License-Identifier: MIT
// The other end of org.freedesktop.Notifications: a server that does what the test says, and a stranger on
// the bus.
#pragma once

#include <systemd/sd-bus.h>

#include <atomic>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "platform/work/run_loop.h"

namespace brivo::test {

/// A connection to the session bus with a thread of its own.
class BusPeer {
 public:
  BusPeer();
  /// Hangs up.
  ~BusPeer();
  BusPeer(const BusPeer&) = delete;
  BusPeer& operator=(const BusPeer&) = delete;

  /// Runs `task` on the peer's thread and waits for it.
  void run(const std::function<void(sd_bus*)>& task);
  /// Sends a signal of org.freedesktop.Notifications with what `append` puts into it; to everybody when there
  /// is no destination.
  void signal(const std::string& destination, const char* member,
              const std::function<void(sd_bus_message*)>& append);
  std::string name();

 private:
  RunLoop loop_;
  sd_bus* bus_ = nullptr;
  std::thread thread_;
};

/// What a server was asked to show.
struct Shown {
  std::uint32_t id = 0;
  std::string client;  ///< its unique name
  std::string application;
  std::uint32_t replaces = 0;
  std::string icon;
  std::string title;
  std::string body;
  std::vector<std::pair<std::string, std::string>> actions;  ///< keys and labels
  int urgency = -1;
  std::int32_t timeout = -1;

  /// The key of the button with this label.
  std::string keyOf(const std::string& label) const;
};

/// A notification server on the session bus, until it goes.
class NotificationServer {
 public:
  enum class Habit {
    normal,
    refuses,         ///< answers Notify with an error
    saysNumberZero,  ///< which is no notification
    isSilent,        ///< keeps the calls until answerAll()
    closesFirst,     ///< closes the notification, and then answers
    losesItsName,    ///< answers, and lets go of its name and takes it again
  };

  explicit NotificationServer(std::vector<std::string> capabilities = {"body", "actions"},
                              Habit habit = Habit::normal);
  ~NotificationServer();
  NotificationServer(const NotificationServer&) = delete;
  NotificationServer& operator=(const NotificationServer&) = delete;

  /// Everything that it was asked to show.
  std::vector<Shown> shown();
  /// Waits until it was asked to show `count` notifications, and gives the last.
  Shown waitForShown(std::size_t count = 1);
  /// The numbers that CloseNotification was called with.
  std::vector<std::uint32_t> withdrawn();

  void press(const Shown& notification, const std::string& key);
  void close(const Shown& notification, std::uint32_t reason);
  /// Answers what a silent server was asked.
  void answerAll();
  BusPeer& peer() { return peer_; }

 private:
  static int onCapabilities(sd_bus_message* call, void* self, sd_bus_error*);
  static int onNotify(sd_bus_message* call, void* self, sd_bus_error*);
  static int onClose(sd_bus_message* call, void* self, sd_bus_error*);
  int answer(sd_bus_message* call, std::uint32_t id);

  const std::vector<std::string> capabilities_;
  const Habit habit_;
  std::uint32_t lastId_ = 0;                 // peer's thread
  std::vector<sd_bus_message*> unanswered_;  // peer's thread
  std::mutex mutex_;
  std::vector<Shown> shown_;
  std::vector<std::uint32_t> withdrawn_;
  BusPeer peer_;  // goes first
};

}  // namespace brivo::test
