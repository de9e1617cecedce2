// SPDX-License-Identifier: MIT
#include "platform/base/base64.h"

#include <algorithm>

#include "check.h"

// What was encoded is decoded to itself, and no text hurts.
int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const auto bytes = std::as_bytes(std::span(data, size));
  const auto decoded = brivo::decodeBase64(brivo::encodeBase64(bytes));
  check(decoded && std::ranges::equal(*decoded, bytes));
  (void)brivo::decodeBase64(textOf(data, size));
  return 0;
}
