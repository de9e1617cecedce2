// SPDX-License-Identifier: MIT
#include "platform/identity/process_facts.h"

#include "check.h"

// A process has a positive number.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto text = textOf(data, size);
  if (const auto process = brivo::processInFdinfo(text)) check(*process > 0);
  (void)brivo::startTimeInStat(text);
  return 0;
}
