// SPDX-License-Identifier: MIT
#include "platform/identity/sandbox_labels.h"

#include "check.h"

// A name that is given is no empty one, and never a path.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto text = textOf(data, size);
  if (const auto application = brivo::applicationInFlatpakInfo(text)) {
    check(!application->empty() && application->find_first_of("/\n\x1b") == std::string::npos);
  }
  if (const auto snap = brivo::snapInSecurityLabel(text)) check(!snap->empty());
  return 0;
}
