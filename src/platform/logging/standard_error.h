// SPDX-License-Identifier: MIT
#pragma once

#include <string_view>

namespace brivo {

/// Writes all of `text` to standard error; what cannot be written is lost, since there is nobody to tell.
/// *Thread-safe.*
void writeToStandardError(std::string_view text);

}  // namespace brivo
