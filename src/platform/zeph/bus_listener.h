// SPDX-License-Identifier: MIT
#pragma once

#include <systemd/sd-event.h>

#include <memory>
#include <string>

#include "platform/base/mutex.h"
#include "platform/base/unique_fd.h"
#include "platform/work/run_loop.h"
#include "platform/work/serial_queue.h"
#include "platform/zeph/listener.h"

namespace brivo::zeph {

/// What a listener needs from the connection service. On the I/O thread.
class ListenerHost {
 public:
  virtual ~ListenerHost() = default;
  /// A connection over an accepted socket, known to the service until it ends.
  virtual std::shared_ptr<Connection> adopt(UniqueFd socket, const AuditToken& peer) = 0;
  virtual void fault(const std::string& line) = 0;
};

/// The Listener over a unix socket.
class BusListener final : public Listener, public std::enable_shared_from_this<BusListener> {
 public:
  /// New connections whose delegate has not decided yet; more wait in the kernel.
  static constexpr std::size_t kMostUndecided = 256;
  static constexpr int kBacklog = 4096;

  /// A listening socket at `path`, for this user alone. Descriptors go from the service to its
  /// clients and never the other way.
  static Result<UniqueFd> bind(const std::string& path);
  /// Makes the kernel refuse descriptors that peers of the listening `socket` send (SO_PASSRIGHTS,
  /// Linux 6.16): libsystemd 252 leaks those that come with a malformed message. Elsewhere it does
  /// nothing.
  static void refuseDescriptors(const UniqueFd& socket);

  /// `socket` listens. The socket file is removed with the listener when `ownsFile`. `loop` and
  /// `host` must outlive the listener.
  BusListener(std::shared_ptr<RunLoop> loop, ListenerHost& host, std::shared_ptr<SerialQueue> queue,
              UniqueFd socket, std::string path, bool ownsFile);
  ~BusListener() override;

  const Endpoint& endpoint() const override { return endpoint_; }
  void setDelegate(std::weak_ptr<ListenerDelegate> delegate) override BRIVO_EXCLUDES(mutex_);
  void resume() override;
  void invalidate() override;
  Result<std::weak_ptr<Connection>, CallError> admit(UniqueFd socket, const AuditToken& peer) override;

  // I/O thread.
  /// Accepts who has connected to its own socket file, which nobody finds from here on, and then nobody more.
  /// Who connects to the socket of a launch service waits there.
  void stopAccepting();
  void goOnAccepting();

 private:
  // I/O thread.
  void setAccepting(bool accepting);
  void accept();
  void take(UniqueFd socket);
  std::shared_ptr<Connection> letDecide(UniqueFd socket, const AuditToken& peer);
  void decided();

  bool decide(const std::shared_ptr<Connection>& connection) BRIVO_EXCLUDES(mutex_);

  const std::shared_ptr<RunLoop> loop_;  // its service may end before the last task that needs this
  ListenerHost& host_;
  const std::shared_ptr<SerialQueue> queue_;
  const std::string path_;
  const bool ownsFile_;
  const Endpoint endpoint_;

  Mutex mutex_;
  std::weak_ptr<ListenerDelegate> delegate_ BRIVO_GUARDED_BY(mutex_);
  bool fileIsGone_ BRIVO_GUARDED_BY(mutex_) = false;

  // I/O thread.
  UniqueFd socket_;
  std::shared_ptr<BusListener> listening_;  // this, from resume() to invalidate()
  sd_event_source* source_ = nullptr;
  bool isHidden_ = false;
  std::size_t undecided_ = 0;
};

}  // namespace brivo::zeph
