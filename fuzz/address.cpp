// SPDX-License-Identifier: MIT
#include "platform/zeph/address.h"

#include "check.h"

// Any path survives the way into an address and back, and no address hurts.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto text = textOf(data, size);
  const auto there = brivo::zeph::endpointForPath(text);
  if (!text.empty()) check(brivo::zeph::pathOfEndpoint(there) == text);
  (void)brivo::zeph::pathOfEndpoint(brivo::Endpoint{std::string(text)});
  return 0;
}
