// SPDX-License-Identifier: MIT
// One connection between a client process and the service.
//
// Both sides use it alike. The accepting side gets it from a listener's delegate, the other from
// ConnectionService::connect(). Set interfaces, exported object and handlers, then resume(); from
// then on calls of the peer reach the exported object on the connection's own serial queue. Exactly
// one of the two end handlers runs, once, on that queue.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/base/result.h"
#include "platform/base/value.h"
#include "platform/identity/audit_token.h"
#include "platform/work/task.h"
#include "platform/zeph/protocol.h"

namespace brivo::zeph {

class Connection;

using Arguments = std::vector<Value>;

/// A call that was not answered with values: a D-Bus error name and a text for people.
struct CallError {
  std::string name;
  std::string text;
};

using Answer = Result<Arguments, CallError>;
using AnswerHandler = std::function<void(Answer)>;
using ErrorHandler = std::function<void(const CallError&)>;

inline constexpr const char* kErrorAccessDenied = "org.freedesktop.DBus.Error.AccessDenied";
inline constexpr const char* kErrorFailed = "org.freedesktop.DBus.Error.Failed";
inline constexpr const char* kErrorDisconnected = "org.freedesktop.DBus.Error.Disconnected";
inline constexpr const char* kErrorInvalidArgs = "org.freedesktop.DBus.Error.InvalidArgs";
inline constexpr const char* kErrorLimitsExceeded = "org.freedesktop.DBus.Error.LimitsExceeded";
inline constexpr const char* kErrorNoReply = "org.freedesktop.DBus.Error.NoReply";
inline constexpr const char* kErrorNotSupported = "org.freedesktop.DBus.Error.NotSupported";
inline constexpr const char* kErrorUnknownMethod = "org.freedesktop.DBus.Error.UnknownMethod";

/// The one answer of a call: values, or an error by name. Copies stand for the same answer; the first one
/// given counts. When the last copy goes without an answer, the caller gets an error instead of waiting for
/// ever. *Thread-safe.*
template <class Values>
class ReplyOf {
 public:
  using Sink = std::function<void(Result<Values, CallError>)>;

  /// `sink` is called once, on the thread that answers.
  explicit ReplyOf(Sink sink);

  void operator()(Values values) const;
  void fail(CallError error) const;

 private:
  struct State;
  std::shared_ptr<State> state_;
};

template <class Values>
struct ReplyOf<Values>::State {
  explicit State(Sink handler) : sink(std::move(handler)) {}
  ~State() { answer(CallError{kErrorNoReply, "The request was dropped"}); }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  void answer(Result<Values, CallError> given) {
    if (!answered.exchange(true)) sink(std::move(given));
  }

  Sink sink;
  std::atomic<bool> answered = false;
};

template <class Values>
ReplyOf<Values>::ReplyOf(Sink sink) : state_(std::make_shared<State>(std::move(sink))) {}

template <class Values>
void ReplyOf<Values>::operator()(Values values) const {
  state_->answer(std::move(values));
}

template <class Values>
void ReplyOf<Values>::fail(CallError error) const {
  state_->answer(std::move(error));
}

extern template class ReplyOf<Arguments>;
using Reply = ReplyOf<Arguments>;

/// A call of the peer on the exported object.
struct Invocation {
  std::shared_ptr<Connection> connection;
  /// One of the exported protocol's, valid for the program's life.
  std::string_view selector;
  /// As many and of such types as the selector's signature says.
  Arguments arguments;
  Reply reply;
};

/// What a connection makes callable by its peer.
class ExportedObject {
 public:
  virtual ~ExportedObject() = default;
  /// Runs on the connection's queue, one call at a time. Work that may take long is handed on
  /// together with the reply.
  virtual void handle(Invocation invocation) = 0;
};

/// Calls to the peer. *Thread-safe*, and free to outlive the connection: then every call fails.
class RemoteObjectProxy {
 public:
  RemoteObjectProxy(std::weak_ptr<Connection> connection, ErrorHandler onError)
      : connection_(std::move(connection)), onError_(std::move(onError)) {}

  /// One way: nothing waits for the peer. The arguments are shared, so that one message can go to
  /// many. The error handler hears, perhaps at once, when the message can no longer be delivered.
  void send(std::string_view selector, std::shared_ptr<const Arguments> arguments) const;
  /// `onAnswer` runs once on the connection's queue, with an error when there is no answer within
  /// `timeout`.
  void call(std::string_view selector, Arguments arguments, std::chrono::milliseconds timeout,
            AnswerHandler onAnswer) const;

 private:
  std::weak_ptr<Connection> connection_;
  ErrorHandler onError_;
};

/// *Thread-safe.* The setters belong before resume().
class Connection : public std::enable_shared_from_this<Connection> {
 public:
  virtual ~Connection() = default;

  virtual const AuditToken& auditToken() const = 0;
  /// The peer's process, as it was when it connected.
  std::int32_t processIdentifier() const { return auditToken().processIdentifier(); }

  virtual void setExportedInterface(Interface interface) = 0;
  virtual void setRemoteObjectInterface(Interface interface) = 0;
  virtual void setExportedObject(std::weak_ptr<ExportedObject> object) = 0;
  /// Runs when the peer went away or broke the protocol. An empty task clears it; so for the next.
  virtual void setInterruptionHandler(Task handler) = 0;
  /// Runs after invalidate(), or when the peer left too much unread.
  virtual void setInvalidationHandler(Task handler) = 0;

  /// Lets the peer lend memory: descriptors in its calls arrive as SharedBuffer. Without it such calls are
  /// refused, and so, where the kernel can, is their sending.
  virtual void acceptBuffers() = 0;
  /// Starts talking.
  virtual void resume() = 0;
  /// Ends the connection. What was sent before goes out as far as the socket takes it without
  /// waiting.
  virtual void invalidate() = 0;

  RemoteObjectProxy remoteObjectProxyWithErrorHandler(ErrorHandler onError) {
    return RemoteObjectProxy(weak_from_this(), std::move(onError));
  }

  /// True while the peer leaves many messages unread but goes on reading: a sender of much should
  /// wait. A peer that stopped reading is nobody to wait for.
  virtual bool isBacklogged() const = 0;
  /// Runs `task` once, on any thread, when isBacklogged() has become false or the connection has
  /// ended.
  virtual void whenNotBacklogged(Task task) = 0;

 private:
  friend class RemoteObjectProxy;
  virtual void send(std::string_view selector, std::shared_ptr<const Arguments> arguments,
                    const ErrorHandler& onError) = 0;
  virtual void call(std::string_view selector, Arguments arguments, std::chrono::milliseconds timeout,
                    AnswerHandler onAnswer) = 0;
};

}  // namespace brivo::zeph
