// SPDX-License-Identifier: MIT
#pragma once

#include <memory>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"
#include "platform/base/value.h"
#include "platform/zeph/connection.h"

namespace brivo::zeph {

class Listener;

/// Decides on every new connection.
class ListenerDelegate {
 public:
  virtual ~ListenerDelegate() = default;
  /// Runs on the listener's queue, one connection at a time, before anything of the peer is read;
  /// it may block. To accept, set the connection up, resume it and return true. After false it is
  /// closed.
  virtual bool shouldAcceptNewConnection(Listener& listener,
                                         const std::shared_ptr<Connection>& connection) = 0;
};

/// A place where clients connect. Peers must be of the service's own user or root (a service that
/// is root itself takes every user); others are closed at once. *Thread-safe*, but for admit().
class Listener {
 public:
  virtual ~Listener() = default;

  /// Where clients find it.
  virtual const Endpoint& endpoint() const = 0;
  /// Not owned; connections that find no delegate are closed.
  virtual void setDelegate(std::weak_ptr<ListenerDelegate> delegate) = 0;
  /// Starts accepting. Clients that connected before have waited.
  virtual void resume() = 0;
  /// Takes a connected socket as if `peer` had connected; an error for the peer when that may not be. I/O
  /// thread.
  virtual Result<std::weak_ptr<Connection>, CallError> admit(UniqueFd socket, const AuditToken& peer) = 0;
  /// Ends accepting and removes the socket file. Connections that exist go on.
  virtual void invalidate() = 0;
};

}  // namespace brivo::zeph
