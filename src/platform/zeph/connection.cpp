// SPDX-License-Identifier: MIT
#include "platform/zeph/connection.h"

#include <atomic>

namespace brivo::zeph {

struct Reply::State {
  explicit State(AnswerHandler handler) : sink(std::move(handler)) {}
  ~State() { answer(CallError{kErrorNoReply, "The request was dropped"}); }
  State(const State&) = delete;
  State& operator=(const State&) = delete;

  void answer(Answer given) {
    if (!answered.exchange(true)) sink(std::move(given));
  }

  AnswerHandler sink;
  std::atomic<bool> answered = false;
};

Reply::Reply(AnswerHandler sink) : state_(std::make_shared<State>(std::move(sink))) {}

void Reply::operator()(Arguments values) const { state_->answer(std::move(values)); }

void Reply::fail(CallError error) const { state_->answer(std::move(error)); }

void RemoteObjectProxy::send(std::string_view selector, std::shared_ptr<const Arguments> arguments) const {
  if (const auto connection = connection_.lock()) {
    connection->send(selector, std::move(arguments), onError_);
  } else if (onError_) {
    onError_({kErrorDisconnected, "The connection is gone"});
  }
}

void RemoteObjectProxy::call(std::string_view selector, Arguments arguments,
                             std::chrono::milliseconds timeout, AnswerHandler onAnswer) const {
  if (const auto connection = connection_.lock()) {
    connection->call(selector, std::move(arguments), timeout, std::move(onAnswer));
  } else {
    onAnswer(CallError{kErrorDisconnected, "The connection is gone"});
  }
}

}  // namespace brivo::zeph
