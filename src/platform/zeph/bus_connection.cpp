// SPDX-License-Identifier: MIT
#include "platform/zeph/bus_connection.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstring>
#include <utility>

#include "platform/zeph/send_burst.h"
#include "platform/zeph/value_codec.h"

namespace brivo::zeph {

namespace {

constexpr std::chrono::milliseconds kLongestWait = std::chrono::hours(24 * 365);

}  // namespace

BusConnection::BusConnection(std::shared_ptr<RunLoop> loop, std::shared_ptr<SerialQueue> queue,
                             ConnectionObserver& observer, UniqueFd socket, BusLink::Role role,
                             AuditToken peer)
    : loop_(std::move(loop)),
      queue_(std::move(queue)),
      observer_(observer),
      role_(role),
      peer_(std::move(peer)),
      socket_(std::move(socket)) {}

BusConnection::~BusConnection() = default;

void BusConnection::setExportedInterface(Interface interface) { exported_ = std::move(interface); }
void BusConnection::setRemoteObjectInterface(Interface interface) { remote_ = std::move(interface); }
void BusConnection::setExportedObject(std::weak_ptr<ExportedObject> object) { object_ = std::move(object); }

void BusConnection::setInterruptionHandler(Task handler) {
  const MutexLock lock(mutex_);
  interruptionHandler_ = std::move(handler);
}

void BusConnection::setInvalidationHandler(Task handler) {
  const MutexLock lock(mutex_);
  invalidationHandler_ = std::move(handler);
}

std::shared_ptr<BusConnection> BusConnection::self() {
  return std::static_pointer_cast<BusConnection>(shared_from_this());
}

void BusConnection::resume() {
  loop_->post([self = self()] { self->start(); });
}

void BusConnection::invalidate() {
  loop_->post([self = self()] { self->end(End::invalidated, ""); });
}

// ------------------------------------------------------------------------------------------------ any thread

void BusConnection::send(std::string_view selector, std::shared_ptr<const Arguments> arguments,
                         const ErrorHandler& onError) {
  const Member* member = remote_ ? remote_->protocol().withSelector(selector) : nullptr;
  const std::size_t size = weight(*arguments);
  if ((!member || !enqueue({OutgoingSignal{member, std::move(arguments)}, size})) && onError) {
    onError({kErrorDisconnected, "The connection has ended"});
  }
}

void BusConnection::call(std::string_view selector, Arguments arguments, std::chrono::milliseconds timeout,
                         AnswerHandler onAnswer) {
  const Member* member = remote_ ? remote_->protocol().withSelector(selector) : nullptr;
  const std::size_t size = weight(arguments);
  auto fail = onAnswer;
  const auto deadline = Clock::now() + std::min(timeout, kLongestWait);
  if (!member ||
      !enqueue({OutgoingCall{member, std::move(arguments), deadline, std::move(onAnswer)}, size})) {
    fail(CallError{kErrorDisconnected, "The connection has ended"});
  }
}

bool BusConnection::enqueue(Outgoing message) {
  if (over_.load(std::memory_order_relaxed)) return false;
  if (++waitingMessages_ == 1) lastProgress_ = Clock::now().time_since_epoch().count();
  waitingBytes_ += message.weight;
  if (waitingMessages_ > kMostWaitingMessages || waitingBytes_ > kMostWaitingBytes) {
    if (over_.exchange(true)) return false;
    loop_->post([self = self()] {
      self->end(End::invalidated, fmt::format("leaves {} messages of {} bytes unread",
                                              self->waitingMessages_.load(), self->waitingBytes_.load()));
    });
    return false;
  }
  {
    const MutexLock lock(mutex_);
    if (over_) return false;  // whoever ends the connection has taken what waited
    outgoing_.push_back(std::move(message));
    if (linkWoken_) return true;
  }
  SendBurst* burst = SendBurst::ofThisThread();
  if (!burst || !burst->takesOver(self())) wake();
  return true;
}

void BusConnection::wake() {
  {
    const MutexLock lock(mutex_);
    if (std::exchange(linkWoken_, true)) return;
  }
  flushOnLoop();
}

void BusConnection::flushOnLoop() {
  loop_->post([self = self()] {
    {
      const MutexLock lock(self->mutex_);
      self->linkWoken_ = false;
    }
    if (self->link_) self->link_->flush();
  });
}

bool BusConnection::isBacklogged() const {
  if (over_ || (waitingMessages_ < kBacklogMessages && waitingBytes_ < kBacklogBytes)) return false;
  const Clock::duration idle = Clock::now().time_since_epoch() - Clock::duration(lastProgress_.load());
  return idle < kStallTime;
}

void BusConnection::whenNotBacklogged(Task task) {
  {
    const MutexLock lock(mutex_);
    waiters_.push_back(std::move(task));
    if (waiters_.size() > 1) return;
  }
  loop_->post([self = self()] { self->watchBacklog(); });
}

void BusConnection::runWaiters() {
  std::vector<Task> waiters;
  {
    const MutexLock lock(mutex_);
    waiters.swap(waiters_);
  }
  for (const Task& waiter : waiters) waiter();
}

Reply BusConnection::replyFor(std::uint64_t token) {
  ++callsInWork_;
  return Reply([self = self(), token](Answer answer) {
    if (token != 0) {
      const std::size_t size = answer.ok() ? weight(*answer) : 0;
      self->enqueue({OutgoingAnswer{token, std::move(answer)}, size});
    }
    if (self->callsInWork_-- == kMostCallsInWork) {
      self->loop_->post([self] { self->callFinished(); });
    }
  });
}

// ------------------------------------------------------------------------------------------------ I/O thread

void BusConnection::start() {
  if (ended_ || link_ || !exported_ || !remote_) return;
  auto link =
      BusLink::open(loop_->event(), std::move(socket_), role_, takesBuffers_, *exported_, *remote_, *this);
  if (!link.ok()) {
    const bool hungUp = BusLink::isHangUp(link.error());
    return end(End::interrupted,
               hungUp ? "" : fmt::format("cannot be served: {}", std::strerror(-link.error())));
  }
  link_ = std::move(*link);
  link_->flush();
}

void BusConnection::end(End how, const std::string& why) {
  if (std::exchange(ended_, true)) return;
  over_ = true;
  if (!why.empty()) observer_.fault(fmt::format("{} {}", peerName(), why));
  if (how == End::invalidated) sendWhatWaits();
  discardLink();
  socket_.reset();
  Task handler;
  {
    const MutexLock lock(mutex_);
    handler = std::move(how == End::interrupted ? interruptionHandler_ : invalidationHandler_);
    interruptionHandler_ = nullptr;
    invalidationHandler_ = nullptr;
  }
  if (handler) queue_->post(std::move(handler));
  runWaiters();
  observer_.connectionEnded(shared_from_this());
}

/// As far as the socket takes it at once.
void BusConnection::sendWhatWaits() {
  std::size_t before = 0;
  do {
    before = waitingMessages_;
    if (link_) link_->flush();
  } while (waitingMessages_ < before);
}

/// The link goes on a later pass of the loop: it may be below us on the stack.
void BusConnection::discardLink() {
  struct Remains {
    std::shared_ptr<BusConnection> owner;  // outlives the link, which still answers its calls
    std::unique_ptr<BusLink> link;
  };
  loop_->post([remains = std::make_shared<Remains>(Remains{self(), std::move(link_)})] {});
  for (Outgoing& message : takeOutgoing(kMostWaitingMessages)) {
    if (auto* call = std::get_if<OutgoingCall>(&message.message)) {
      answered(std::move(call->onAnswer), CallError{kErrorDisconnected, "The connection ended"});
    }
  }
}

void BusConnection::callFinished() {
  if (link_ && callsInWork_ < kMostCallsInWork) link_->setReading(true);
}

void BusConnection::received(const Member& member, Arguments arguments, std::uint64_t token) {
  Reply reply = replyFor(token);
  if (role_ == BusLink::Role::service && callsInWork_ >= kMostCallsInWork) link_->setReading(false);
  queue_->post([self = self(), selector = member.selector, arguments = std::move(arguments),
                reply = std::move(reply)]() mutable {
    if (const auto object = self->object_.lock()) {
      object->handle({self, selector, std::move(arguments), std::move(reply)});
    } else {
      reply.fail({kErrorDisconnected, "The object is gone"});
    }
  });
}

void BusConnection::answered(AnswerHandler handler, Answer answer) {
  queue_->post(
      [handler = std::move(handler), answer = std::move(answer)]() mutable { handler(std::move(answer)); });
}

std::deque<Outgoing> BusConnection::takeOutgoing(std::size_t most) {
  std::deque<Outgoing> taken;
  const MutexLock lock(mutex_);
  while (!outgoing_.empty() && taken.size() < most) {
    taken.push_back(std::move(outgoing_.front()));
    outgoing_.pop_front();
  }
  return taken;
}

void BusConnection::left(std::size_t messages, std::size_t bytes) {
  lastProgress_ = Clock::now().time_since_epoch().count();
  waitingMessages_ -= messages;
  waitingBytes_ -= bytes;
  if (waitingMessages_ < kBacklogMessages / 2 && waitingBytes_ < kBacklogBytes / 2) runWaiters();
}

void BusConnection::watchBacklog() {
  {
    const MutexLock lock(mutex_);
    if (waiters_.empty()) return;
  }
  if (!isBacklogged()) return runWaiters();
  loop_->postAfter(kStallTime / 4, [self = self()] { self->watchBacklog(); });
}

void BusConnection::ended(const std::string& why) {
  end(End::interrupted, why.empty() ? why : "broke the protocol: " + why);
}

std::string BusConnection::peerName() const {
  return fmt::format("process {} of user {}", peer_.processIdentifier(), peer_.userIdentifier());
}

}  // namespace brivo::zeph
