// SPDX-License-Identifier: MIT
#pragma once

#include <string>

namespace brivo {

/// The translation of `message` in a gettext domain whose catalogues this build installs; the message itself
/// when there is none. The program must have called setlocale(3) to speak anything but English.
/// *Thread-safe.*
std::string localizedMessage(const char* domain, const std::string& message);

}  // namespace brivo
