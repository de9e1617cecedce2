// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_link.h"

#include <sys/socket.h>
#include <systemd/sd-id128.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <limits>

#include "platform/bus/bus_message.h"
#include "platform/zeph/bus_driver.h"
#include "platform/zeph/bus_vtable.h"
#include "platform/zeph/pass_rights.h"
#include "platform/zeph/value_codec.h"

namespace brivo::zeph {

namespace {

constexpr int kMessagesPerTurn = 64;
constexpr std::size_t kMostInBus = 32;

std::string errorText(int code) { return std::strerror(code < 0 ? -code : code); }

/// One identity of the service's end for all connections of the process.
sd_id128_t serverIdentity() {
  static const sd_id128_t identity = [] {
    sd_id128_t id{};
    sd_id128_randomize(&id);
    return id;
  }();
  return identity;
}

}  // namespace

struct BusLink::PendingCall {
  PendingCall(BusLink& owner, const Member& called, AnswerHandler handler)
      : link(owner), member(called), onAnswer(std::move(handler)) {}
  ~PendingCall() { sd_bus_slot_unref(slot); }
  PendingCall(const PendingCall&) = delete;
  PendingCall& operator=(const PendingCall&) = delete;

  BusLink& link;
  const Member& member;
  AnswerHandler onAnswer;
  sd_bus_slot* slot = nullptr;
};

Result<std::unique_ptr<BusLink>, int> BusLink::open(sd_event* event, UniqueFd socket, Role role,
                                                    bool takesBuffers, const Interface& exported,
                                                    const Interface& remote, LinkOwner& owner) {
  std::unique_ptr<BusLink> link(new BusLink(event, role, takesBuffers, exported, remote, owner));
  const int result = link->start(std::move(socket));
  if (result < 0) return result;
  return link;
}

BusLink::BusLink(sd_event* event, Role role, bool takesBuffers, const Interface& exported,
                 const Interface& remote, LinkOwner& owner)
    : role_(role),
      takesBuffers_(takesBuffers),
      exported_(exported),
      remote_(remote),
      owner_(owner),
      event_(sd_event_ref(event)) {}

BusLink::~BusLink() {
  for (sd_event_source* source : {io_, timer_, again_}) sd_event_source_disable_unref(source);
  for (const auto& [token, call] : callsToAnswer_) sd_bus_message_unref(call.message);
  for (const auto& [key, call] : callsToHear_) {
    owner_.answered(std::move(call->onAnswer), CallError{kErrorDisconnected, "The connection ended"});
  }
  callsToHear_.clear();
  for (Outgoing& waiting : toPut_) {
    if (auto* call = std::get_if<OutgoingCall>(&waiting.message)) {
      owner_.answered(std::move(call->onAnswer), CallError{kErrorDisconnected, "The connection ended"});
    }
  }
  if (bus_) sd_bus_close(bus_);
  sd_bus_unref(bus_);
  sd_event_unref(event_);
}

int BusLink::start(UniqueFd socket) {
  int result = sd_bus_new(&bus_);
  if (result < 0) return result;
  if (takesBuffers_) {
    constexpr int yes = 1;
    ::setsockopt(socket.get(), SOL_SOCKET, SO_PASSRIGHTS, &yes, sizeof yes);
  }
  watched_ = socket.duplicate();
  if (!watched_) return -errno;
  const int fd = socket.release();  // sd-bus closes it from here on
  result = sd_bus_set_fd(bus_, fd, fd);
  if (result < 0) {
    UniqueFd close(fd);
    return result;
  }
  sd_bus_negotiate_fds(bus_, 1);
  if (role_ == Role::service) {
    sd_bus_set_server(bus_, 1, serverIdentity());
    sd_bus_set_sender(bus_, kServiceName);
  }
  result = sd_bus_start(bus_);
  if (result >= 0) result = serveObjects();
  if (result < 0) return result;

  // Not sd_bus_attach_event(): it looks at one message per wake-up of the socket, and so never at a
  // first call that came in one read with the end of the authentication.
  const auto onIo = [](sd_event_source*, int, std::uint32_t, void* self) {
    static_cast<BusLink*>(self)->turn();
    return 0;
  };
  const auto onTime = [](sd_event_source*, std::uint64_t, void* self) {
    static_cast<BusLink*>(self)->turn();
    return 0;
  };
  const auto onAgain = [](sd_event_source*, void* self) {
    static_cast<BusLink*>(self)->turn();
    return 0;
  };
  result = sd_event_add_io(event_, &io_, watched_.get(), EPOLLIN, onIo, this);
  if (result >= 0) result = sd_event_add_time(event_, &timer_, CLOCK_MONOTONIC, UINT64_MAX, 0, onTime, this);
  if (result >= 0) result = sd_event_add_defer(event_, &again_, onAgain, this);
  return result;  // the deferred source is on: the first turn comes with the next pass of the loop
}

int BusLink::serveObjects() {
  const auto onAny = [](sd_bus_message* message, void* self, sd_bus_error*) {
    return static_cast<BusLink*>(self)->onMessage(message);
  };
  int result = sd_bus_add_filter(bus_, nullptr, onAny, this);
  if (result < 0 || role_ == Role::client) return result;
  const auto onCall = [](sd_bus_message* message, void* self, sd_bus_error* error) {
    return static_cast<BusLink*>(self)->onMethod(message, error);
  };
  result = addBusDriver(bus_);
  if (result < 0) return result;
  const Protocol& protocol = exported_.protocol();
  return sd_bus_add_object_vtable(bus_, nullptr, kObjectPath, protocol.interface, vtableOf(protocol, onCall),
                                  this);
}

void BusLink::flush() { turn(); }

void BusLink::setReading(bool reading) {
  if (reading_ == reading || ended_) return;
  reading_ = reading;
  if (reading) sd_event_source_set_enabled(again_, SD_EVENT_ONESHOT);
  rearm();
}

void BusLink::turn() {
  if (ended_) return;
  // Until the peer has taken the rest of a message nothing else may be written, an answer of sd-bus's own
  // neither.
  if (batch_.isInsideMessage() && !writeBatch()) return rearm();
  // While reading is off, sd-bus is only asked to write; it may still take in a message now and
  // then.
  int result = reading_ || queuedInBus() > 0 ? 1 : 0;
  for (int i = 0; i < kMessagesPerTurn && result > 0 && (reading_ || i == 0); ++i) {
    result = sd_bus_process(bus_, nullptr);
  }
  if (result < 0) {
    return end(isHangUp(result) ? "" : errorText(result));
  }
  if (result > 0 && reading_) sd_event_source_set_enabled(again_, SD_EVENT_ONESHOT);
  refill();
  if (role_ == Role::client && peerIsSilent()) giveUpLateCalls();
  rearm();
}

void BusLink::end(const std::string& why) {
  if (ended_) return;
  ended_ = true;
  for (sd_event_source* source : {io_, timer_, again_}) sd_event_source_set_enabled(source, SD_EVENT_OFF);
  owner_.ended(why);
}

std::size_t BusLink::queuedInBus() const {
  std::uint64_t queued = 0;
  return sd_bus_get_n_queued_write(bus_, &queued) < 0 ? 0 : queued;
}

void BusLink::settleSent() {
  const std::size_t queued = queuedInBus();
  std::size_t messages = 0;
  std::size_t bytes = 0;
  for (; weightsInBus_.size() > queued; ++messages) {
    bytes += weightsInBus_.front();
    weightsInBus_.pop_front();
  }
  if (messages > 0) owner_.left(messages, bytes);
}

bool BusLink::peerIsSilent() const {
  // Before the peer has authenticated, sd-bus does not know whether it takes descriptors.
  return sd_bus_is_ready(bus_) <= 0 || queuedInBus() >= kMostInBus;
}

bool BusLink::batch(const Outgoing& next) {
  const auto* signal = std::get_if<OutgoingSignal>(&next.message);
  // Behind what sd-bus still has to write, order is kept by leaving this to it as well.
  if (!signal || next.weight >= kDescriptorThreshold || queuedInBus() > 0) return false;
  return batch_.append(*signal, remote_.protocol().interface, next.weight);
}

bool BusLink::writeBatch() {
  const SignalBatch::Written written = batch_.writeTo(sd_bus_get_fd(bus_));
  const SignalBatch::Left left = batch_.takeLeft();
  if (left.messages > 0) owner_.left(left.messages, left.weight);
  if (written == SignalBatch::Written::hungUp) end("");
  return written == SignalBatch::Written::all;
}

void BusLink::refill() {
  if (ended_) return;
  settleSent();
  for (int i = 0; i < kMessagesPerTurn; ++i) {
    if (peerIsSilent() || (batch_.isFull() && !writeBatch())) return;  // continues when the socket takes more
    if (toPut_.empty()) toPut_ = owner_.takeOutgoing(kMessagesPerTurn);
    if (toPut_.empty()) return (void)writeBatch();
    if (batch(toPut_.front())) {
      toPut_.pop_front();
      continue;
    }
    if (!writeBatch()) return;
    Outgoing next = std::move(toPut_.front());
    toPut_.pop_front();
    const int result = std::visit([&](auto& message) { return put(message); }, next.message);
    weightsInBus_.push_back(next.weight);
    settleSent();
    if (isHangUp(result)) return end("");
  }
  if (writeBatch()) sd_event_source_set_enabled(again_, SD_EVENT_ONESHOT);  // others first
}

void BusLink::giveUpLateCalls() {
  if (ended_) return;
  // All of them: the timer goes by the first that is due.
  std::deque<Outgoing> more = owner_.takeOutgoing(std::numeric_limits<std::size_t>::max());
  std::ranges::move(more, std::back_inserter(toPut_));
  const auto now = std::chrono::steady_clock::now();
  std::size_t messages = 0;
  std::size_t bytes = 0;
  std::erase_if(toPut_, [&](Outgoing& waiting) {
    auto* call = std::get_if<OutgoingCall>(&waiting.message);
    if (!call || call->deadline > now) return false;
    owner_.answered(std::move(call->onAnswer),
                    CallError{kErrorNoReply, "The call could not be sent in time"});
    ++messages;
    bytes += waiting.weight;
    return true;
  });
  if (messages > 0) owner_.left(messages, bytes);
}

std::uint64_t BusLink::firstDeadline() const {
  auto first = std::chrono::steady_clock::time_point::max();
  for (const Outgoing& waiting : toPut_) {
    const auto* call = std::get_if<OutgoingCall>(&waiting.message);
    if (call) first = std::min(first, call->deadline);
  }
  if (first == std::chrono::steady_clock::time_point::max()) return UINT64_MAX;
  return static_cast<std::uint64_t>(
      std::chrono::ceil<std::chrono::microseconds>(first.time_since_epoch()).count());
}

void BusLink::rearm() {
  if (ended_) return;
  const int events = sd_bus_get_events(bus_);
  if (events >= 0) {
    auto wanted = static_cast<std::uint32_t>(events);
    if (!reading_ || batch_.isInsideMessage()) wanted &= ~std::uint32_t{EPOLLIN};
    if (!batch_.empty()) wanted |= EPOLLOUT;
    sd_event_source_set_io_events(io_, wanted);
  }
  std::uint64_t due = UINT64_MAX;
  if (reading_) (void)sd_bus_get_timeout(bus_, &due);
  if (role_ == Role::client && peerIsSilent()) due = std::min(due, firstDeadline());
  if (due != UINT64_MAX) {
    sd_event_source_set_time(timer_, due);
    sd_event_source_set_enabled(timer_, SD_EVENT_ONESHOT);
  } else {
    sd_event_source_set_enabled(timer_, SD_EVENT_OFF);
  }
}

// --------------------------------------------------------------------------------------------------- sending

bool BusLink::peerTakesDescriptors() const {
  return role_ == Role::service && sd_bus_can_send(bus_, SD_BUS_TYPE_UNIX_FD) > 0;
}

int BusLink::put(const OutgoingSignal& signal) {
  BusMessage message;
  int result = sd_bus_message_new_signal(bus_, message.out(), kObjectPath, remote_.protocol().interface,
                                         signal.member->dbusName().c_str());
  if (result >= 0) {
    result = appendArguments(message.get(), signal.member->in, *signal.arguments, peerTakesDescriptors());
  }
  return result < 0 ? result : sd_bus_send(bus_, message.get(), nullptr);
}

int BusLink::put(OutgoingAnswer& answer) {
  const auto found = callsToAnswer_.find(answer.token);
  if (found == callsToAnswer_.end()) return 0;
  const auto [call, member] = found->second;
  callsToAnswer_.erase(found);
  int result = 0;
  if (answer.answer.ok()) {
    BusMessage message;
    result = sd_bus_message_new_method_return(call, message.out());
    if (result >= 0) {
      result = appendArguments(message.get(), member->out, answer.answer.value(), peerTakesDescriptors());
    }
    if (result >= 0) result = sd_bus_send(bus_, message.get(), nullptr);
    if (result < 0) {
      result = sd_bus_reply_method_errorf(call, SD_BUS_ERROR_LIMITS_EXCEEDED, "The answer cannot be sent: %s",
                                          errorText(result).c_str());
    }
  } else {
    const CallError& error = answer.answer.error();
    result = sd_bus_reply_method_errorf(call, error.name.c_str(), "%s", error.text.c_str());
  }
  sd_bus_message_unref(call);
  return result;
}

int BusLink::put(OutgoingCall& call) {
  BusMessage message;
  int result = sd_bus_message_new_method_call(bus_, message.out(), nullptr, kObjectPath,
                                              remote_.protocol().interface, call.member->dbusName().c_str());
  if (result >= 0) {
    result = appendArguments(message.get(), call.member->in, call.arguments, peerTakesDescriptors());
  }
  if (result < 0) {
    owner_.answered(std::move(call.onAnswer), CallError{kErrorInvalidArgs, errorText(result)});
    return 0;
  }
  auto pending = std::make_unique<PendingCall>(*this, *call.member, std::move(call.onAnswer));
  const auto onReply = [](sd_bus_message* reply, void* userdata, sd_bus_error*) {
    auto* answeredCall = static_cast<PendingCall*>(userdata);
    answeredCall->link.onAnswer(*answeredCall, reply);
    return 0;
  };
  const auto left =
      std::chrono::duration_cast<std::chrono::microseconds>(call.deadline - std::chrono::steady_clock::now());
  result = sd_bus_call_async(bus_, &pending->slot, message.get(), onReply, pending.get(),
                             static_cast<std::uint64_t>(std::max<std::int64_t>(left.count(), 1)));
  if (result < 0) {
    owner_.answered(std::move(pending->onAnswer), CallError{kErrorDisconnected, errorText(result)});
    return result;
  }
  callsToHear_.emplace(pending.get(), std::move(pending));
  return 0;
}

// ------------------------------------------------------------------------------------------------- receiving

void BusLink::onAnswer(PendingCall& call, sd_bus_message* message) {
  const auto answer = [&]() -> Answer {
    if (sd_bus_message_is_method_error(message, nullptr)) {
      const sd_bus_error* error = sd_bus_message_get_error(message);
      // What sd-bus says of calls that were waiting when the peer hung up is what it says of late answers.
      if (sd_bus_is_open(bus_) <= 0) return CallError{kErrorDisconnected, "The connection ended"};
      return CallError{error->name ? error->name : kErrorFailed, error->message ? error->message : ""};
    }
    auto values = readArguments(message, Descriptors::asData);
    if (!values || !sd_bus_message_has_signature(message, call.member.out) ||
        (!values->empty() &&
         !remote_.admits(values->front(), call.member.selector, Interface::Origin::reply))) {
      return CallError{kErrorInvalidArgs, "The answer is not what the protocol says"};
    }
    return std::move(*values);
  };
  owner_.answered(std::move(call.onAnswer), answer());
  callsToHear_.erase(&call);
}

/// Sees every message before sd-bus looks for an object.
int BusLink::onMessage(sd_bus_message* message) {
  const char* path = sd_bus_message_get_path(message);
  const char* interface = sd_bus_message_get_interface(message);
  const char* name = sd_bus_message_get_member(message);
  const Protocol& protocol = exported_.protocol();
  if (!path || !name || std::strcmp(path, kObjectPath) != 0 ||
      (interface && std::strcmp(interface, protocol.interface) != 0)) {
    return 0;
  }
  const Member* member = protocol.withDBusName(name);
  if (!member) return 0;
  if (role_ == Role::service) {
    if (member->serving == Member::Serving::served ||
        !sd_bus_message_is_method_call(message, nullptr, nullptr)) {
      return 0;
    }
    sd_bus_reply_method_errorf(message, kErrorUnknownMethod, "%s is not served", name);
    return 1;
  }
  if (member->kind != Member::Kind::signal || !sd_bus_message_is_signal(message, nullptr, nullptr)) return 0;
  auto arguments = readArguments(message, Descriptors::asData);
  if (arguments && sd_bus_message_has_signature(message, member->in)) {
    receive(*member, std::move(*arguments), message);
  }
  return 1;
}

/// sd-bus has found the method and checked the signature.
int BusLink::onMethod(sd_bus_message* message, sd_bus_error* error) {
  const Member* member = exported_.protocol().withDBusName(sd_bus_message_get_member(message));
  auto arguments = readArguments(message, takesBuffers_ ? Descriptors::asBuffers : Descriptors::refused);
  if (!member || !arguments ||
      (!arguments->empty() &&
       !exported_.admits(arguments->front(), member->selector, Interface::Origin::argument))) {
    return sd_bus_error_set(error, kErrorInvalidArgs, "An argument has a type that is not taken here");
  }
  receive(*member, std::move(*arguments), message);
  return 1;
}

void BusLink::receive(const Member& member, Arguments arguments, sd_bus_message* message) {
  std::uint64_t token = 0;
  if (member.kind == Member::Kind::method && sd_bus_message_get_expect_reply(message) > 0) {
    token = ++lastToken_;
    callsToAnswer_.emplace(token, CallToAnswer{sd_bus_message_ref(message), &member});
  }
  owner_.received(member, std::move(arguments), token);
}

}  // namespace brivo::zeph
