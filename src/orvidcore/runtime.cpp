// SPDX-License-Identifier: MIT
#include "orvidcore/runtime.h"

#include <thread>

namespace orvid {

std::shared_ptr<Runtime> Runtime::create() {
  return std::shared_ptr<Runtime>(new Runtime, [](Runtime* runtime) {
    if (brivo::Pool::ofThisThread() == &runtime->pool_) {
      std::thread([runtime] { delete runtime; }).detach();  // a pool cannot end on its own thread
    } else {
      delete runtime;
    }
  });
}

Error errorOf(const brivo::zeph::CallError& error) {
  if (error.name == brivo::zeph::kErrorDisconnected)
    return {ErrorKind::disconnected, 0, "the connection ended"};
  if (error.name == brivo::zeph::kErrorNoReply) return {ErrorKind::timedOut, 0, "no answer in time"};
  return {ErrorKind::malformed, 0, error.name + ": " + error.text};
}

Result<Dictionary> dictionaryOf(const brivo::zeph::Arguments& answer) {
  const auto* dictionary = answer.empty() ? nullptr : answer.front().get<Dictionary>();
  if (!dictionary) return Error{ErrorKind::malformed, 0, "the answer is no dictionary"};
  return *dictionary;
}

}  // namespace orvid
