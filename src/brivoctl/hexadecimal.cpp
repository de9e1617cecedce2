// SPDX-License-Identifier: MIT
#include "brivoctl/hexadecimal.h"

#include <fmt/format.h>

#include <iterator>

namespace brivoctl {

std::string hexOf(std::span<const std::byte> bytes) {
  std::string text;
  text.reserve(2 * bytes.size());
  for (const std::byte byte : bytes) fmt::format_to(std::back_inserter(text), "{:02x}", byte);
  return text;
}

}  // namespace brivoctl
