// SPDX-License-Identifier: MIT
// The wire end of a connection: sd-bus on the I/O thread.
#pragma once

#include <systemd/sd-bus.h>
#include <systemd/sd-event.h>

#include <cerrno>
#include <cstdint>
#include <deque>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "platform/base/result.h"
#include "platform/base/unique_fd.h"
#include "platform/zeph/outgoing.h"
#include "platform/zeph/protocol.h"
#include "platform/zeph/signal_batch.h"

namespace brivo::zeph {

/// What a link needs from its connection. All on the I/O thread; none may destroy the link.
class LinkOwner {
 public:
  virtual ~LinkOwner() = default;

  /// A call (service side) or a signal (client side) with checked arguments. `token` names the call
  /// for its OutgoingAnswer; 0 when the peer wants none.
  virtual void received(const Member& member, Arguments arguments, std::uint64_t token) = 0;
  /// An answer to an OutgoingCall.
  virtual void answered(AnswerHandler handler, Answer answer) = 0;
  /// Up to `most` messages to put on the wire.
  virtual std::deque<Outgoing> takeOutgoing(std::size_t most) = 0;
  /// Messages have left for the socket or were given up.
  virtual void left(std::size_t messages, std::size_t bytes) = 0;
  /// The peer hung up ("") or broke the protocol (why). The link does nothing more.
  virtual void ended(const std::string& why) = 0;
};

/// Owns the socket, reads and checks messages, and feeds sd-bus no faster than the socket takes
/// them, so that what waits can be counted. Small signals go past sd-bus, many with one system call.
/// *Thread-bound* to the I/O thread.
class BusLink {
 public:
  /// Whether an error of sd-bus is that the peer has gone.
  static bool isHangUp(int result) {
    return result == -ECONNRESET || result == -ENOTCONN || result == -EPIPE;
  }

  enum class Role { service, client };

  /// Takes over the connected socket. The peer of a service may send descriptors when it `takesBuffers`.
  /// A negative errno, with the socket closed, when the peer has hung up or there is not enough memory.
  static Result<std::unique_ptr<BusLink>, int> open(sd_event* event, UniqueFd socket, Role role,
                                                    bool takesBuffers, const Interface& exported,
                                                    const Interface& remote, LinkOwner& owner);
  ~BusLink();
  BusLink(const BusLink&) = delete;
  BusLink& operator=(const BusLink&) = delete;

  /// Puts on the wire what waits, as far as the socket takes it.
  void flush();
  /// Stops or starts reading; a peer that is not read from has to wait.
  void setReading(bool reading);

 private:
  struct PendingCall;
  struct CallToAnswer {
    sd_bus_message* message;
    const Member* member;
  };

  BusLink(sd_event* event, Role role, bool takesBuffers, const Interface& exported, const Interface& remote,
          LinkOwner& owner);
  int start(UniqueFd socket);
  int serveObjects();

  /// Lets sd-bus work for a while, then fills it up again and says when to continue.
  void turn();
  void refill();
  void rearm();
  void end(const std::string& why);

  /// Nothing can be put on the wire now: the peer has not authenticated yet, or does not read.
  bool peerIsSilent() const;
  /// Gives up calls that were due before they could be put on the wire.
  void giveUpLateCalls();
  /// When the first of those is due, on the clock of sd_bus_get_timeout(3).
  std::uint64_t firstDeadline() const;

  int put(const OutgoingSignal& signal);
  /// Takes a small signal into the batch; false for any other message, which sd-bus has to send.
  bool batch(const Outgoing& next);
  /// Writes the batch as far as the socket takes it; false when something of it still waits.
  bool writeBatch();
  int put(OutgoingAnswer& answer);
  int put(OutgoingCall& call);
  void settleSent();
  /// Messages that sd-bus holds because the socket is full.
  std::size_t queuedInBus() const;
  /// The service takes none: see BusListener::bind().
  bool peerTakesDescriptors() const;

  int onMessage(sd_bus_message* message);
  int onMethod(sd_bus_message* message, sd_bus_error* error);
  void onAnswer(PendingCall& call, sd_bus_message* message);
  void receive(const Member& member, Arguments arguments, sd_bus_message* message);

  const Role role_;
  const bool takesBuffers_;
  const Interface& exported_;
  const Interface& remote_;
  LinkOwner& owner_;

  sd_event* event_;
  sd_bus* bus_ = nullptr;
  // sd-bus closes its descriptor when the peer hangs up. A process that is being started may hold the socket
  // a moment longer, and what the event loop watches has to be taken from it before that.
  UniqueFd watched_;
  sd_event_source* io_ = nullptr;
  sd_event_source* timer_ = nullptr;
  sd_event_source* again_ = nullptr;
  bool reading_ = true;
  bool ended_ = false;

  std::uint64_t lastToken_ = 0;
  std::map<std::uint64_t, CallToAnswer> callsToAnswer_;
  std::map<PendingCall*, std::unique_ptr<PendingCall>> callsToHear_;
  std::deque<Outgoing> toPut_;
  SignalBatch batch_;
  std::deque<std::size_t> weightsInBus_;  // of messages that sd-bus has not written yet, oldest first
};

}  // namespace brivo::zeph
