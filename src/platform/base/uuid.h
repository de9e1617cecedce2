// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// A fresh random UUID (RFC 9562, version 4) in canonical form with upper-case digits.
/// *Thread-safe.*
std::string randomUuidString();

}  // namespace brivo
