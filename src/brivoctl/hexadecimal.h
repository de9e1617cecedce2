// SPDX-License-Identifier: MIT
#pragma once

#include <cstddef>
#include <span>
#include <string>

namespace brivoctl {

/// Two lower-case digits for each byte.
std::string hexOf(std::span<const std::byte> bytes);

}  // namespace brivoctl
