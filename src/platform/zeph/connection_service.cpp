// SPDX-License-Identifier: MIT
#include "platform/zeph/connection_service.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <sys/un.h>
#include <systemd/sd-daemon.h>

#include <algorithm>
#include <cerrno>
#include <cstring>

#include "platform/base/uuid.h"
#include "platform/logging/log_ring.h"
#include "platform/work/serial_queue.h"
#include "platform/work/thread_name.h"
#include "platform/zeph/address.h"

namespace brivo::zeph {

namespace {

/// The first listening unix stream socket that a launch service passed.
UniqueFd activatedSocket() {
  const int count = sd_listen_fds(1);
  UniqueFd socket;
  for (int fd = SD_LISTEN_FDS_START; fd < SD_LISTEN_FDS_START + count; ++fd) {
    UniqueFd passed(fd);
    if (!socket && sd_is_socket_unix(fd, SOCK_STREAM, 1, nullptr, 0) > 0) {
      ::fcntl(fd, F_SETFL, ::fcntl(fd, F_GETFL) | O_NONBLOCK);
      socket = std::move(passed);
    }
  }
  return socket;
}

std::string pathOfSocket(int fd) {
  sockaddr_un address{};
  socklen_t size = sizeof address;
  if (::getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size) != 0) return {};
  const std::size_t length = size - offsetof(sockaddr_un, sun_path);
  return std::string(address.sun_path, ::strnlen(address.sun_path, length));
}

}  // namespace

ConnectionService::ConnectionService(Pool& pool, FaultHandler onFault)
    : pool_(pool), onFault_(std::move(onFault)), thread_([this] {
        setThreadName("io");
        const LogRing ring;  // a blocked reader of the log must not stop every client
        loop_->run();
      }) {}

ConnectionService::~ConnectionService() {
  loop_->post([this] {
    for (const auto& weak : listeners_) {
      if (const auto listener = weak.lock()) listener->invalidate();
    }
    for (const auto& connection : connections_) connection->invalidate();
    if (door_) door_->end();
    loop_->post([this] { loop_->quit(); });  // after what ending them posts
  });
  thread_.join();
}

std::shared_ptr<BusListener> ConnectionService::makeListener(UniqueFd socket, std::string path,
                                                             bool ownsFile) {
  auto listener =
      std::make_shared<BusListener>(loop_, static_cast<ListenerHost&>(*this), SerialQueue::create(pool_),
                                    std::move(socket), std::move(path), ownsFile);
  loop_->post([this, weak = std::weak_ptr(listener)] {
    std::erase_if(listeners_, [](const auto& one) { return one.expired(); });
    listeners_.push_back(weak);
  });
  return listener;
}

Result<std::shared_ptr<Listener>> ConnectionService::namedListener(const RuntimeFolder& folder,
                                                                   const std::string& name) {
  if (UniqueFd passed = activatedSocket()) {
    activated_ = true;
    BusListener::refuseDescriptors(passed);
    std::string path = pathOfSocket(passed.get());
    return std::shared_ptr<Listener>(makeListener(std::move(passed), std::move(path), false));
  }
  const std::string path = folder.pathOf(name);
  auto socket = BusListener::bind(path);
  if (!socket) return socket.error();
  return std::shared_ptr<Listener>(makeListener(std::move(*socket), path, true));
}

Result<std::shared_ptr<Listener>> ConnectionService::anonymousListener(const RuntimeFolder& folder) {
  const std::string path = folder.pathOf("device-" + randomUuidString());
  auto socket = BusListener::bind(path);
  if (!socket) return socket.error();
  return std::shared_ptr<Listener>(makeListener(std::move(*socket), path, true));
}

Result<std::shared_ptr<Connection>> ConnectionService::connect(const Endpoint& endpoint,
                                                               std::chrono::milliseconds timeout) {
  const auto path = pathOfEndpoint(endpoint);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (!path || path->size() >= sizeof address.sun_path) {
    return SystemError{"no usable address: " + endpoint.address};
  }
  std::memcpy(address.sun_path, path->c_str(), path->size() + 1);
  UniqueFd socket(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  if (!socket) return SystemError{"make a socket", errno};
  const timeval limit{timeout.count() / 1000, timeout.count() % 1000 * 1000};
  ::setsockopt(socket.get(), SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof limit);
  if (::connect(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    return SystemError{"connect to " + *path, errno};
  }
  ::fcntl(socket.get(), F_SETFL, ::fcntl(socket.get(), F_GETFL) | O_NONBLOCK);
  const AuditToken peer = AuditToken::ofPeer(socket.get());
  auto connection = std::make_shared<BusConnection>(loop_, SerialQueue::create(pool_),
                                                    static_cast<ConnectionObserver&>(*this),
                                                    std::move(socket), BusLink::Role::client, peer);
  loop_->post([this, connection] { connections_.insert(connection); });
  return std::shared_ptr<Connection>(std::move(connection));
}

void ConnectionService::openDoor(DoorPlan plan) {
  loop_->post([this, plan = std::move(plan)] {
    door_ = std::make_shared<BusDoor>(loop_, plan);
    door_->open();
  });
}

void ConnectionService::stopAcceptingIfIdle(std::function<void(bool idle)> answer) {
  loop_->post([this, answer = std::move(answer)] {
    for (const auto& weak : listeners_) {
      if (const auto listener = weak.lock()) listener->stopAccepting();
    }
    const bool idle = isIdle();
    if (!idle) goOn();
    answer(idle);
  });
}

void ConnectionService::closeDoorIfIdle(std::function<void(bool idle)> answer) {
  loop_->post([this, answer = std::move(answer)] {
    const auto closed = [this, answer](bool isClosed) {
      const bool idle = isClosed && isIdle();
      if (!idle) goOn();
      answer(idle);
    };
    if (!door_ || !isIdle()) return closed(true);
    door_->giveNameUp(closed);
  });
}

void ConnectionService::goOn() {
  for (const auto& weak : listeners_) {
    if (const auto listener = weak.lock()) listener->goOnAccepting();
  }
  if (door_) door_->takeNameAgain();
}

std::shared_ptr<Connection> ConnectionService::adopt(UniqueFd socket, const AuditToken& peer) {
  auto connection = std::make_shared<BusConnection>(loop_, SerialQueue::create(pool_),
                                                    static_cast<ConnectionObserver&>(*this),
                                                    std::move(socket), BusLink::Role::service, peer);
  connections_.insert(connection);
  return connection;
}

void ConnectionService::connectionEnded(const std::shared_ptr<Connection>& connection) {
  connections_.erase(connection);
}

void ConnectionService::fault(const std::string& line) {
  if (onFault_) onFault_(line);
}

}  // namespace brivo::zeph
