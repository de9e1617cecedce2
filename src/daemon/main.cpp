// SPDX-License-Identifier: MIT
// brivod: serves camera cards to image-capture clients.
#include <clocale>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <thread>

#include "daemon/service.h"
#include "platform/process/process_setup.h"
#include "util/log.h"

namespace {

/// A card that does not answer must not keep a process that was told to go.
constexpr std::chrono::seconds kLongestEnd{5};

void endInTime() {
  std::thread([] {
    std::this_thread::sleep_for(kLongestEnd);
    std::_Exit(EXIT_SUCCESS);
  }).detach();
}

}  // namespace

int main() {
  std::setlocale(LC_MESSAGES, "");
  brivo::prepareProcess();
  brivo::RunLoop mainLoop;
  mainLoop.onSignals({SIGTERM, SIGINT}, [&] { mainLoop.quit(); });
  {
    auto service = brivo::Service::start(mainLoop);
    if (!service.ok()) {
      brivo::OVLogError("brivo[zeph]", "cannot start: {}", service.error().text());
      return EXIT_FAILURE;
    }
    mainLoop.run();
    endInTime();
  }
  return EXIT_SUCCESS;
}
