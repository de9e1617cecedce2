// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// The text for `key` in the user's language, from the "OrvidCore" string table; the key itself when there is
/// none. *Thread-safe.*
std::string OVLocalizedString(const std::string& key);

}  // namespace brivo
