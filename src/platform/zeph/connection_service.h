// SPDX-License-Identifier: MIT
// The inter-process connection service: one I/O thread that owns every socket of the process.
#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <set>
#include <string>
#include <thread>

#include "platform/base/result.h"
#include "platform/work/pool.h"
#include "platform/work/run_loop.h"
#include "platform/zeph/bus_connection.h"
#include "platform/zeph/bus_door.h"
#include "platform/zeph/bus_listener.h"
#include "platform/zeph/door.h"
#include "platform/zeph/listener.h"
#include "platform/zeph/runtime_folder.h"

namespace brivo::zeph {

/// Makes listeners and connections. Handlers of connections and delegates of listeners run on the
/// pool. *Thread-safe.*
class ConnectionService final : private ListenerHost, private ConnectionObserver {
 public:
  /// Hears one line about every peer that broke a rule; called on the I/O thread, must not block.
  using FaultHandler = std::function<void(const std::string& line)>;

  /// `pool` must outlive the service.
  ConnectionService(Pool& pool, FaultHandler onFault);
  /// Ends every connection and waits for the I/O thread.
  ~ConnectionService() override;
  ConnectionService(const ConnectionService&) = delete;
  ConnectionService& operator=(const ConnectionService&) = delete;

  /// The listener under which the process was started by socket activation (sd_listen_fds(3)), else
  /// one of its own at `name` in `folder`. The folder must outlive the listener.
  Result<std::shared_ptr<Listener>> namedListener(const RuntimeFolder& folder, const std::string& name);
  /// A listener at a fresh path, "device-<uuid>" in `folder`.
  Result<std::shared_ptr<Listener>> anonymousListener(const RuntimeFolder& folder);
  /// True when namedListener() was given its socket by a launch service.
  bool startedByActivation() const { return activated_; }

  /// Connects to a listener of another process (or this one). Waits at most `timeout` for a busy
  /// listener.
  Result<std::shared_ptr<Connection>> connect(const Endpoint& endpoint, std::chrono::milliseconds timeout);

  /// Opens a door on the session bus, if there is one; at most once. Nothing depends on it.
  void openDoor(DoorPlan plan);

  /// Stops accepting and tells `answer`, on the I/O thread, whether no peer is connected or waiting
  /// for a decision. When there is one, accepting goes on. Sockets of the service's own are out of sight
  /// meanwhile; those of a launch service collect clients for the next process.
  void stopAcceptingIfIdle(std::function<void(bool idle)> answer);
  /// To be called when that was so: closes the door too, and tells `answer`, on the I/O thread, whether
  /// nobody came through it until then. When somebody did, the door opens again and accepting goes on.
  void closeDoorIfIdle(std::function<void(bool idle)> answer);

 private:
  std::shared_ptr<BusListener> makeListener(UniqueFd socket, std::string path, bool ownsFile);

  // I/O thread.
  /// Whether there is neither a connection nor a call that asks for one.
  bool isIdle() const { return connections_.empty() && (!door_ || door_->visitsInWork() == 0); }
  void goOn();
  std::shared_ptr<Connection> adopt(UniqueFd socket, const AuditToken& peer) override;
  void connectionEnded(const std::shared_ptr<Connection>& connection) override;
  void fault(const std::string& line) override;

  Pool& pool_;
  const FaultHandler onFault_;
  std::atomic<bool> activated_ = false;
  const std::shared_ptr<RunLoop> loop_ = std::make_shared<RunLoop>();

  // I/O thread.
  std::set<std::shared_ptr<Connection>> connections_;
  std::vector<std::weak_ptr<BusListener>> listeners_;
  std::shared_ptr<BusDoor> door_;

  std::thread thread_;  // last: uses everything above
};

}  // namespace brivo::zeph
