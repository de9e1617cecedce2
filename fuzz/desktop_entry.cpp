// SPDX-License-Identifier: MIT
#include "platform/applications/desktop_entry.h"

#include "check.h"

// What is an application has a program.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto entry = brivo::parseDesktopEntry(textOf(data, size));
  if (entry) check(!entry->program.empty());
  return 0;
}
