// SPDX-License-Identifier: MIT
#pragma once

#include <atomic>
#include <deque>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/base/mutex.h"
#include "platform/work/run_loop.h"
#include "platform/work/serial_queue.h"
#include "platform/zeph/bus_link.h"
#include "platform/zeph/connection.h"

namespace brivo::zeph {

/// Told when a connection ends or misbehaves. On the I/O thread.
class ConnectionObserver {
 public:
  virtual ~ConnectionObserver() = default;
  virtual void connectionEnded(const std::shared_ptr<Connection>& connection) = 0;
  /// One line that names the peer and the rule it broke.
  virtual void fault(const std::string& line) = 0;
};

/// The Connection over a socket: takes messages from any thread, queues and charges them, and hands
/// them to its link on the I/O thread; hands what the link receives to its serial queue.
class BusConnection final : public Connection, private LinkOwner {
 public:
  /// A peer that leaves more than this unread is ended.
  static constexpr std::size_t kMostWaitingMessages = 100'000;
  static constexpr std::size_t kMostWaitingBytes = std::size_t{64} << 20;
  /// From here on a peer counts as backlogged, until half of it has gone.
  static constexpr std::size_t kBacklogMessages = 2048;
  static constexpr std::size_t kBacklogBytes = std::size_t{4} << 20;
  /// A backlogged peer that takes nothing for this long is not waited for.
  static constexpr std::chrono::seconds kStallTime{1};
  /// Calls of one peer in work at a time; the rest stays in its socket.
  static constexpr std::size_t kMostCallsInWork = 256;

  /// `loop` and `observer` must outlive the connection's end.
  BusConnection(std::shared_ptr<RunLoop> loop, std::shared_ptr<SerialQueue> queue,
                ConnectionObserver& observer, UniqueFd socket, BusLink::Role role, AuditToken peer);
  ~BusConnection() override;

  const AuditToken& auditToken() const override { return peer_; }
  void setExportedInterface(Interface interface) override;
  void setRemoteObjectInterface(Interface interface) override;
  void setExportedObject(std::weak_ptr<ExportedObject> object) override;
  void setInterruptionHandler(Task handler) override;
  void setInvalidationHandler(Task handler) override;
  void acceptBuffers() override { takesBuffers_ = true; }
  void resume() override;
  void invalidate() override;
  bool isBacklogged() const override;
  void whenNotBacklogged(Task task) override;

  /// Has the I/O thread send what waits.
  void wake() BRIVO_EXCLUDES(mutex_);

 private:
  enum class End { interrupted, invalidated };
  using Clock = std::chrono::steady_clock;

  void send(std::string_view selector, std::shared_ptr<const Arguments> arguments,
            const ErrorHandler& onError) override;
  void call(std::string_view selector, Arguments arguments, std::chrono::milliseconds timeout,
            AnswerHandler onAnswer) override;

  // Any thread.
  bool enqueue(Outgoing message) BRIVO_EXCLUDES(mutex_);
  void flushOnLoop();
  bool isOver() const;
  Reply replyFor(std::uint64_t token);
  std::shared_ptr<BusConnection> self();
  void runWaiters() BRIVO_EXCLUDES(mutex_);

  // I/O thread.
  void start();
  void end(End how, const std::string& why);
  void sendWhatWaits();
  void discardLink();
  void callFinished();
  void watchBacklog();
  void received(const Member& member, Arguments arguments, std::uint64_t token) override;
  void answered(AnswerHandler handler, Answer answer) override;
  std::deque<Outgoing> takeOutgoing(std::size_t most) override BRIVO_EXCLUDES(mutex_);
  void left(std::size_t messages, std::size_t bytes) override;
  void ended(const std::string& why) override;
  std::string peerName() const;

  const std::shared_ptr<RunLoop> loop_;  // its service may end before the last task that needs this
  const std::shared_ptr<SerialQueue> queue_;
  ConnectionObserver& observer_;
  const BusLink::Role role_;
  const AuditToken peer_;

  // Set before resume().
  std::optional<Interface> exported_;
  std::optional<Interface> remote_;
  std::weak_ptr<ExportedObject> object_;
  bool takesBuffers_ = false;

  std::atomic<std::size_t> waitingMessages_ = 0;
  std::atomic<std::size_t> waitingBytes_ = 0;
  std::atomic<Clock::rep> lastProgress_ = 0;
  std::atomic<std::size_t> callsInWork_ = 0;
  std::atomic<bool> over_ = false;

  mutable Mutex mutex_;
  Task interruptionHandler_ BRIVO_GUARDED_BY(mutex_);
  Task invalidationHandler_ BRIVO_GUARDED_BY(mutex_);
  std::deque<Outgoing> outgoing_ BRIVO_GUARDED_BY(mutex_);
  bool linkWoken_ BRIVO_GUARDED_BY(mutex_) = false;
  std::vector<Task> waiters_ BRIVO_GUARDED_BY(mutex_);

  // I/O thread.
  bool ended_ = false;
  UniqueFd socket_;
  std::unique_ptr<BusLink> link_;
};

}  // namespace brivo::zeph
