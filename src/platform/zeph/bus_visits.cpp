// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_visits.h"

#include <fcntl.h>
#include <sys/socket.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string_view>

#include "platform/zeph/bus_credentials.h"
#include "platform/zeph/bus_vtable.h"
#include "platform/zeph/call_receipt.h"
#include "platform/zeph/value_codec.h"

namespace brivo::zeph {

template class ReplyOf<Passage>;

namespace {

constexpr const char* kBus = "org.freedesktop.DBus";
constexpr const char* kBusPath = "/org/freedesktop/DBus";
constexpr std::size_t kMostHanded = 64;

int replyWithError(sd_bus_message* call, const CallError& error) {
  return sd_bus_reply_method_errorf(call, error.name.c_str(), "%s", error.text.c_str());
}

/// Says so without a copy of any. Leaves `call` to be read from its beginning.
bool hasTextLongerThan(sd_bus_message* call, std::size_t most) {
  const char* text = nullptr;
  bool isLonger = false;
  while (!isLonger && sd_bus_message_read_basic(call, 's', &text) > 0) {
    isLonger = ::strnlen(text, most + 1) > most;
  }
  sd_bus_message_rewind(call, 1);
  return isLonger;
}

/// Two connected ends; the first does not block.
Result<std::pair<UniqueFd, UniqueFd>, CallError> connectedPair() {
  int ends[2];
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) {
    return CallError{kErrorLimitsExceeded, std::strerror(errno)};
  }
  std::pair<UniqueFd, UniqueFd> pair{UniqueFd(ends[0]), UniqueFd(ends[1])};
  ::fcntl(ends[0], F_SETFL, ::fcntl(ends[0], F_GETFL) | O_NONBLOCK);
  return pair;
}

}  // namespace

/// A call from its arrival to its answer.
struct BusVisits::Visitor {
  Visitor(BusVisits& owner, std::uint64_t ordinal, BusMessage receipt, const Member& called, Arguments values)
      : visits(owner),
        number(ordinal),
        call(std::move(receipt)),
        member(called),
        arguments(std::move(values)) {}
  ~Visitor() { sd_bus_slot_unref(question); }
  Visitor(const Visitor&) = delete;
  Visitor& operator=(const Visitor&) = delete;

  const char* name() const { return sd_bus_message_get_sender(call.get()); }

  BusVisits& visits;
  const std::uint64_t number;
  BusMessage call;
  const Member& member;
  Arguments arguments;
  std::optional<AuditToken> token;
  Step then = nullptr;
  sd_bus_slot* question = nullptr;
};

BusVisits::BusVisits(std::shared_ptr<RunLoop> loop, sd_bus* bus, const DoorPlan& plan)
    : loop_(std::move(loop)), bus_(bus), plan_(plan) {}

BusVisits::~BusVisits() = default;

int BusVisits::start() {
  const auto onCall = [](sd_bus_message* message, void* self, sd_bus_error* error) {
    return static_cast<BusVisits*>(self)->onMethod(message, error);
  };
  const auto onMessage = [](sd_bus_message* message, void* self, sd_bus_error*) {
    return static_cast<BusVisits*>(self)->onAny(message);
  };
  const int result = sd_bus_add_object_vtable(bus_, nullptr, kObjectPath, plan_.protocol.interface,
                                              vtableOf(plan_.protocol, onCall), this);
  return result < 0 ? result : sd_bus_add_filter(bus_, nullptr, onMessage, this);
}

int BusVisits::onMethod(sd_bus_message* call, sd_bus_error* error) {
  const Member* member = plan_.protocol.withDBusName(sd_bus_message_get_member(call));
  const char* caller = sd_bus_message_get_sender(call);
  if (!caller) return sd_bus_error_set(error, kErrorAccessDenied, "The bus does not say who calls");
  if (hasTooMany(caller)) return sd_bus_error_set(error, kErrorLimitsExceeded, "Too many calls at once");
  if (hasTextLongerThan(call, plan_.longestText)) {
    return sd_bus_error_set(error, plan_.onLongerText.name.c_str(), plan_.onLongerText.text.c_str());
  }
  auto arguments = readArguments(call, Descriptors::refused);
  if (!member || !arguments)
    return sd_bus_error_set(error, kErrorInvalidArgs, "An argument is not taken here");
  BusMessage receipt = receiptFor(call);
  if (!receipt.get()) return -ENOMEM;
  const std::uint64_t number = ++lastNumber_;
  const auto visitor = visitors_.emplace(
      number, std::make_unique<Visitor>(*this, number, std::move(receipt), *member, *std::move(arguments)));
  ask(*visitor.first->second, "GetConnectionCredentials", &BusVisits::credentialsTold);
  return 1;
}

bool BusVisits::hasTooMany(const char* caller) const {
  if (visitors_.size() >= kMostInWork) return true;
  const std::string_view name = caller;
  const auto ofCaller =
      std::ranges::count_if(visitors_, [&](const auto& one) { return one.second->name() == name; });
  return static_cast<std::size_t>(ofCaller) >= kMostOfOneCaller;
}

void BusVisits::ask(Visitor& visitor, const char* member, Step then) {
  const auto onAnswer = [](sd_bus_message* answer, void* userdata, sd_bus_error*) {
    auto* asking = static_cast<Visitor*>(userdata);
    (asking->visits.*asking->then)(*asking, answer);
    return 0;
  };
  visitor.then = then;
  visitor.question = sd_bus_slot_unref(visitor.question);
  const int result = sd_bus_call_method_async(bus_, &visitor.question, kBus, kBusPath, kBus, member, onAnswer,
                                              &visitor, "s", visitor.name());
  if (result < 0) refuse(visitor.number, {kErrorFailed, std::strerror(-result)});
}

void BusVisits::credentialsTold(Visitor& visitor, sd_bus_message* answer) {
  auto credentials = sd_bus_message_is_method_error(answer, nullptr) ? std::nullopt : readCredentials(answer);
  if (!credentials) return refuse(visitor.number, {kErrorAccessDenied, "The bus does not say who calls"});
  const bool isCertain = static_cast<bool>(credentials->pidfd);
  visitor.token = AuditToken::ofCredentials(credentials->ids, std::move(credentials->pidfd));
  if (isCertain) return letIn(visitor);
  // The process identifier is the caller's if the caller is still there now that its process is held.
  ask(visitor, "NameHasOwner", &BusVisits::ownerTold);
}

void BusVisits::ownerTold(Visitor& visitor, sd_bus_message* answer) {
  int isThere = 0;
  if (sd_bus_message_is_method_error(answer, nullptr) || sd_bus_message_read(answer, "b", &isThere) < 0 ||
      !isThere) {
    return refuse(visitor.number, {kErrorAccessDenied, "The caller has gone"});
  }
  letIn(visitor);
}

void BusVisits::letIn(Visitor& visitor) {
  const auto keeper = plan_.keeper.lock();
  if (!keeper) return refuse(visitor.number, {kErrorFailed, "The service is ending"});
  // What answers may be another thread, or what is left of the service: it must not own the visits, which end
  // on the I/O thread.
  const auto sink = [loop = loop_, visits = weak_from_this(),
                     number = visitor.number](Result<Passage, CallError> result) {
    loop->post([visits, number, result = std::move(result)]() mutable {
      if (const auto self = visits.lock()) self->answered(number, std::move(result));
    });
  };
  keeper->visited({visitor.member.selector, std::move(visitor.arguments), ReplyOf<Passage>(sink)});
}

void BusVisits::answered(std::uint64_t number, Result<Passage, CallError> result) {
  const auto found = visitors_.find(number);
  if (found == visitors_.end()) return;
  if (!result.ok()) return refuse(number, result.error());
  const auto socket = admit(*found->second, *result);
  if (!socket.ok()) return refuse(number, socket.error());
  hand(*found->second, *socket, result->values);
  visitors_.erase(number);
}

Result<UniqueFd, CallError> BusVisits::admit(const Visitor& visitor, const Passage& passage) {
  for (auto& process : connections_) {
    std::erase_if(process.second, [](const auto& connection) { return connection.expired(); });
  }
  std::erase_if(connections_, [](const auto& process) { return process.second.empty(); });
  const std::int32_t pid = visitor.token->processIdentifier();
  if (connections_[pid].size() >= kMostOfOneProcess) {
    return CallError{kErrorLimitsExceeded, "The process has too many connections"};
  }
  auto pair = connectedPair();
  if (!pair.ok()) return pair.error();
  const auto connection = passage.listener->admit(std::move(pair->first), *visitor.token);
  if (!connection.ok()) return connection.error();
  connections_[pid].push_back(*connection);
  return std::move(pair->second);
}

void BusVisits::hand(Visitor& visitor, const UniqueFd& socket, const Arguments& values) {
  BusMessage message;
  std::uint64_t cookie = 0;
  int result = sd_bus_message_new_method_return(visitor.call.get(), message.out());
  if (result >= 0) result = sd_bus_message_append(message.get(), "h", socket.get());
  if (result >= 0) result = appendArguments(message.get(), visitor.member.out + 1, values, true);
  if (result >= 0) result = sd_bus_send(bus_, message.get(), &cookie);
  if (result < 0) {
    replyWithError(visitor.call.get(), {kErrorLimitsExceeded, std::strerror(-result)});
    return;
  }
  handed_.emplace_back(cookie, std::move(visitor.call));
  if (handed_.size() > kMostHanded) handed_.pop_front();
}

void BusVisits::refuse(std::uint64_t number, const CallError& error) {
  replyWithError(visitors_.at(number)->call.get(), error);
  visitors_.erase(number);
}

/// A bus answers the sender of a descriptor when the receiver cannot take one; the receiver would wait for
/// ever.
int BusVisits::onAny(sd_bus_message* message) {
  std::uint64_t answeredCookie = 0;
  if (sd_bus_message_is_method_error(message, nullptr) <= 0 ||
      sd_bus_message_get_reply_cookie(message, &answeredCookie) < 0) {
    return 0;
  }
  const auto found = std::ranges::find(handed_, answeredCookie, [](const auto& one) { return one.first; });
  if (found == handed_.end()) return 0;
  replyWithError(found->second.get(), {kErrorNotSupported, "The caller's connection takes no descriptors"});
  handed_.erase(found);
  return 1;
}

}  // namespace brivo::zeph
