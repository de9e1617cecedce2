// SPDX-License-Identifier: MIT
#include "platform/identity/sandbox_labels.h"

#include "check.h"

// A name that is given is no empty one, and a process has a positive number.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto text = textOf(data, size);
  if (const auto application = brivo::applicationInFlatpakInfo(text)) check(!application->empty());
  if (const auto snap = brivo::snapInSecurityLabel(text)) check(!snap->empty());
  if (const auto process = brivo::processInFdinfo(text)) check(*process > 0);
  return 0;
}
