// SPDX-License-Identifier: MIT
#include "platform/zeph/connection.h"

namespace brivo::zeph {

template class ReplyOf<Arguments>;

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
