// SPDX-License-Identifier: MIT
// The second way in: a name on the session bus, for those who can reach the bus and not the sockets.
//
// A method of the door is answered with one end of a connected socket, and its other end becomes a connection
// of a listener, as if the caller had connected there. Who the caller is, is what the bus says.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "platform/zeph/connection.h"
#include "platform/zeph/listener.h"

namespace brivo::zeph {

/// Where a visitor goes, and the values that follow the descriptor in the answer.
struct Passage {
  std::shared_ptr<Listener> listener;
  Arguments values;
};

extern template class ReplyOf<Passage>;

/// A call of a method of the door.
struct Visit {
  /// One of the door's protocol, valid for the program's life.
  std::string_view selector;
  /// As many and of such types as the selector's signature says.
  Arguments arguments;
  ReplyOf<Passage> reply;
};

/// Decides where visitors go.
class Doorkeeper {
 public:
  virtual ~Doorkeeper() = default;
  /// Runs on the I/O thread and must not block; the reply may be given later, on any thread, but not while
  /// another one destroys the connection service.
  virtual void visited(Visit visit) = 0;
};

/// What a door is made of.
struct DoorPlan {
  /// The well-known name on the session bus.
  std::string name;
  /// Methods whose answer begins with a descriptor ("h"), served at kObjectPath. Lives as long as the
  /// program.
  const Protocol& protocol;
  /// Of a text in a call, in bytes. A longer one is not read, and its caller gets the error.
  std::size_t longestText = 0;
  CallError onLongerText;
  /// Not owned; visits that find none are answered with an error.
  std::weak_ptr<Doorkeeper> keeper;
  /// Hears a line when the door opens, closes or cannot; called on the I/O thread, must not block.
  std::function<void(const std::string& line)> onNotice;
};

}  // namespace brivo::zeph
