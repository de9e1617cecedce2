// SPDX-License-Identifier: MIT
#include "brivoctl/asker.h"

namespace brivoctl {

Asker::Asker() {
  pthread_sigmask(SIG_BLOCK, nullptr, &blockedBefore_);
  loop_.onSignals({SIGINT, SIGTERM, SIGHUP}, [this] {
    interrupted_ = true;
    alerts_.dismissAll();
  });
  thread_ = std::thread([this] { loop_.run(); });
}

Asker::~Asker() {
  loop_.quit();
  thread_.join();
  pthread_sigmask(SIG_SETMASK, &blockedBefore_, nullptr);
}

brivo::Result<brivo::UserAlert::Response, Asker::Failure> Asker::ask(const brivo::Dictionary& alert) {
  const auto shown = alerts_.show(alert);
  if (interrupted_) return Failure::interrupted;
  if (!shown) return Failure::nobodyThere;
  const auto response = shown->waitForResponse();
  if (interrupted_) return Failure::interrupted;
  return response;
}

}  // namespace brivoctl
