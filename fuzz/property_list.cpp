// SPDX-License-Identifier: MIT
#include "platform/preferences/property_list.h"

#include "check.h"

// What was read can be written and read again.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto list = brivo::parsePropertyList(textOf(data, size));
  if (list) check(brivo::parsePropertyList(brivo::formatPropertyList(*list)).has_value());
  return 0;
}
