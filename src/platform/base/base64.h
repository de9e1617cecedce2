// SPDX-License-Identifier: MIT
// Base64 (RFC 4648, section 4). Pure and *thread-safe*.
#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace brivo {

std::string encodeBase64(std::span<const std::byte> bytes);

/// White space is skipped, padding may be missing; none when another character turns up.
std::optional<std::vector<std::byte>> decodeBase64(std::string_view text);

}  // namespace brivo
